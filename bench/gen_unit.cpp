// Writes a translation unit of a given size for measurements: gen_unit FUNCTIONS STATEMENTS OUT.if [STATICS [CASES]]
//
// Each function takes an int and a pointer, works on eight int and four long locals with STATEMENTS statements
// (assignments, loads, stores, multiply-accumulates, forward branches, a counted loop around each sixteen) and returns
// a long. `main` calls every function and prints a checksum with `put_i32`, so that a unit can be executed before and
// after. With STATICS, each function adds to one of so many static variables of the file; with CASES, it has a switch of
// so many cases that all end in a break. The same arguments give the same bytes. About eleven nodes a statement; the
// number goes to standard output.

#include "tools/model/ic_builder.h"

#include <cstdlib>
#include <vector>

namespace {

enum OP {
    LABEL = 1,
    NAME = 2,
    ICON = 4,
    PLUS = 6,
    PLUSASG = 7,
    MINUS = 8,
    MULT = 11,
    UMULT = 13,
    UAND = 16,
    XORB = 19,
    RETURN = 36,
    SWITCH = 40,
    CASE = 47,
    COMMA = 56,
    PCOMMA = 57,
    ASG = 58,
    CALL = 70,
    NEQ = 81,
    LT = 83,
    SCONV = 104,
    CBRANCH = 109,
    BRANCH = 114,
};

class GENERATOR : IC_BUILDER {
public:
    GENERATOR(FILE* out, int functions, int statements, int statics, int cases)
        : n_functions(functions), n_statements(statements), n_statics(statics), n_cases(cases) {
        start(out, "generated.c");
    }

    bool run() {
        TYPE* int_ptr = pkg.mk_ptr(pkg.int_t);
        body_type = function_type({pkg.int_t, int_ptr}, pkg.long_t);
        put_type = function_type({pkg.long_t}, pkg.void_t);
        main_type = function_type({}, pkg.int_t);
        IC_SYMBOL* data = global("_data", pkg.mk_array(pkg.int_t, false, 64, true), 3);
        put = global("_put_i32", put_type, 5);
        std::vector<IC_SYMBOL*> bodies;
        for (int i = 0; i < n_functions; ++i) bodies.push_back(global("_f" + std::to_string(i), body_type, 2));
        for (int i = 0; i < n_statics; ++i) statics.push_back(global("_s" + std::to_string(i), pkg.int_t, 3));
        IC_SYMBOL* main_sym = global("_main", main_type, 2);
        for (size_t i = 0; i < bodies.size(); ++i)
            write_function(bodies[i], statics.empty() ? nullptr : statics[i % statics.size()]);
        write_main(main_sym, bodies, data);
        std::printf("%ld nodes\n", node_count);
        return I_FILE::if_close(file, false, false) == 0;
    }

private:
    // ---- Trees
    IC_NODE* name(IC_SYMBOL* s) {
        IC_NODE* n = node(NAME, s->type);
        n->sym = s;
        return n;
    }
    IC_NODE* icon(long v) {
        IC_NODE* n = node(ICON, pkg.int_t);
        n->value = v;
        return n;
    }
    IC_NODE* label_ref(uint32_t label) {
        IC_NODE* n = node(LABEL, pkg.int_t);
        n->number = label;
        return n;
    }
    void statement(IC_NODE* tree) {
        psn.line += 1;
        file->if_write_expr(tree, &psn);
    }
    IC_NODE* element(IC_SYMBOL* p, unsigned i) {
        return node(UMULT, pkg.int_t, node(PLUS, p->type, name(p), icon(static_cast<long>(i & 63))));
    }

    unsigned random() { return (seed = seed * 1103515245u + 12345u) >> 16 & 0x7FFF; }
    IC_SYMBOL* x() { return xs[random() & 7]; }
    IC_SYMBOL* y() { return ys[random() & 3]; }

    // ---- One function
    void assignment() {
        TYPE* t = pkg.int_t;
        switch (random() % 6) {
        case 0: {
            IC_SYMBOL* to = x();
            statement(node(ASG, t, name(to), node(PLUS, t, name(x()), node(MULT, t, name(x()), icon(random() & 15)))));
            break;
        }
        case 1: {
            IC_SYMBOL* to = y();
            IC_NODE* product =
                node(MULT, pkg.long_t, node(SCONV, pkg.long_t, name(x())), node(SCONV, pkg.long_t, name(x())));
            statement(node(PLUSASG, pkg.long_t, name(to), product));
            break;
        }
        case 2: statement(node(ASG, t, element(ptr, random()), node(XORB, t, name(x()), icon(random() & 0xFF)))); break;
        case 3: statement(node(ASG, t, name(x()), node(MINUS, t, element(ptr, random()), name(x())))); break;
        case 4:
            statement(
                node(ASG, t, name(x()), node(XORB, t, node(PLUS, t, name(x()), name(x())), element(ptr, random()))));
            break;
        default: {
            const uint32_t skip = next_label++;
            statement(node(CBRANCH, t, node(LT, t, name(x()), name(x())), label_ref(skip)));
            statement(node(PLUSASG, t, name(x()), icon(random() & 7)));
            file->if_write_label(skip);
            break;
        }
        }
    }

    // Four times around: counter = 4; L: ...; counter -= 1; if (counter != 0) goto L.
    void loop(int count) {
        TYPE* t = pkg.int_t;
        const uint32_t top = next_label++, out = next_label++;
        statement(node(ASG, t, name(counter), icon(4)));
        file->if_write_label(top);
        for (int i = 0; i < count; ++i) assignment();
        statement(node(ASG, t, name(counter), node(MINUS, t, name(counter), icon(1))));
        statement(node(CBRANCH, t, node(NEQ, t, name(counter), icon(0)), label_ref(out)));
        statement(node(BRANCH, t, label_ref(top)));
        file->if_write_label(out);
    }

    // switch (a) { case 0: break; case 1: x1 += 1; break; ... }, each fourth without a statement.
    void switch_over(IC_SYMBOL* selector) {
        TYPE* t = pkg.int_t;
        const uint32_t first = next_label, out = first + static_cast<uint32_t>(n_cases);
        next_label = out + 1;
        IC_NODE* list = nullptr;
        for (int i = 0; i < n_cases; ++i) {
            IC_NODE* one = node(CASE, t, icon(i), label_ref(first + static_cast<uint32_t>(i)));
            list = list ? node(COMMA, t, list, one) : one;
        }
        IC_NODE* whole = node(SWITCH, t, name(selector), list);
        whole->number = static_cast<uint32_t>(n_cases);
        statement(whole);
        statement(node(BRANCH, t, label_ref(out)));
        for (int i = 0; i < n_cases; ++i) {
            file->if_write_label(first + static_cast<uint32_t>(i));
            if (i & 3) statement(node(PLUSASG, t, name(xs[i & 7]), icon(i)));
            statement(node(BRANCH, t, label_ref(out)));
        }
        file->if_write_label(out);
    }

    void write_function(IC_SYMBOL* f, IC_SYMBOL* own_static) {
        next_label = 1;
        psn.line = 1;
        file->if_write_begin_func(f, &psn);
        IC_SYMBOL* a = local("a", pkg.int_t, 17);
        IC_SYMBOL* p = local("p", pkg.mk_ptr(pkg.int_t), 17);
        file->if_write_end_args(&psn);
        IC_SYMBOL* a2 = local("a", pkg.int_t, 1);
        ptr = local("p", pkg.mk_ptr(pkg.int_t), 1);
        for (int i = 0; i < 8; ++i) xs[i] = local("x" + std::to_string(i), pkg.int_t, 1);
        for (int i = 0; i < 4; ++i) ys[i] = local("y" + std::to_string(i), pkg.long_t, 1);
        counter = local("i", pkg.int_t, 1);
        file->if_write_end_locals(&psn);
        statement(node(PCOMMA, pkg.void_t, node(ASG, pkg.int_t, name(a2), name(a)),
                       node(ASG, ptr->type, name(ptr), name(p))));
        for (int i = 0; i < 8; ++i)
            statement(node(ASG, pkg.int_t, name(xs[i]), node(PLUS, pkg.int_t, name(a2), icon(i))));
        for (IC_SYMBOL* s : ys) statement(node(ASG, pkg.long_t, name(s), node(SCONV, pkg.long_t, name(a2))));
        if (own_static) statement(node(PLUSASG, pkg.int_t, name(own_static), name(a2)));
        if (n_cases) switch_over(a2);
        for (int done = 0; done < n_statements; done += 16) loop(std::min(16, n_statements - done));
        IC_NODE* sum = name(ys[0]);
        for (int i = 1; i < 4; ++i) sum = node(XORB, pkg.long_t, sum, name(ys[i]));
        if (own_static) sum = node(PLUS, pkg.long_t, sum, node(SCONV, pkg.long_t, name(own_static)));
        for (IC_SYMBOL* s : xs) sum = node(PLUS, pkg.long_t, sum, node(SCONV, pkg.long_t, name(s)));
        statement(node(RETURN, pkg.long_t, name(f), sum));
        file->if_write_end_func(&psn);
    }

    void write_main(IC_SYMBOL* f, const std::vector<IC_SYMBOL*>& bodies, IC_SYMBOL* data) {
        TYPE* int_ptr = pkg.mk_ptr(pkg.int_t);
        file->if_write_begin_func(f, &psn);
        file->if_write_end_args(&psn);
        IC_SYMBOL* total = local("total", pkg.long_t, 1);
        file->if_write_end_locals(&psn);
        IC_NODE* zero = node(SCONV, pkg.long_t, icon(0));
        statement(node(ASG, pkg.long_t, name(total), zero));
        for (size_t i = 0; i < bodies.size(); ++i) {
            IC_NODE* args = node(COMMA, pkg.int_t, icon(static_cast<long>(i % 100)), node(UAND, int_ptr, name(data)));
            IC_NODE* call = node(CALL, pkg.long_t, node(UAND, pkg.mk_ptr(body_type), name(bodies[i])), args);
            statement(node(PLUSASG, pkg.long_t, name(total), call));
        }
        statement(node(CALL, pkg.void_t, node(UAND, pkg.mk_ptr(put_type), name(put)), name(total)));
        statement(node(RETURN, pkg.int_t, name(f), icon(0)));
        file->if_write_end_func(&psn);
    }

    int n_functions, n_statements, n_statics, n_cases;
    std::vector<IC_SYMBOL*> statics;
    TYPE *body_type = nullptr, *put_type = nullptr, *main_type = nullptr;
    IC_SYMBOL *put = nullptr, *ptr = nullptr, *counter = nullptr;
    IC_SYMBOL* xs[8] = {};
    IC_SYMBOL* ys[4] = {};
    PSN psn{"generated.c", 1, 1};
    unsigned seed = 1;
    uint32_t next_label = 1;
};

} // namespace

int main(int argc, char** argv) {
    if (argc < 4 || argc > 6) {
        std::fprintf(stderr, "usage: gen_unit FUNCTIONS STATEMENTS OUT.if [STATICS [CASES]]\n");
        return 2;
    }
    FILE* out = std::fopen(argv[3], "wb");
    if (!out) {
        std::perror(argv[3]);
        return 1;
    }
    auto number = [&](int i) { return i < argc ? std::atoi(argv[i]) : 0; };
    return GENERATOR(out, number(1), number(2), number(4), number(5)).run() ? 0 : 1;
}
