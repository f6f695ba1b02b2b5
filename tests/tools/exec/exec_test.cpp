// The executor on small units made by hand: arithmetic at the widths' extremes, fields, control, errors.
#include "tools/exec/exec.h"

#include <gtest/gtest.h>

#include <cstdlib>

namespace {
enum : int {
    SCON = 3,
    NAME = 2,
    ICON = 4,
    FCON = 5,
    PLUS = 6,
    PLUSASG = 7,
    MINUS = 8,
    UMINUS = 10,
    MULT = 11,
    UMULT = 13,
    UAND = 16,
    LABEL = 1,
    LCON = 25,
    FIELD = 26,
    ABS = 27,
    RETURN = 36,
    SWITCH = 40,
    DEFAULT = 46,
    CASE = 47,
    COMMA = 56,
    ASG = 58,
    DIV = 60,
    MOD = 62,
    SLL = 64,
    SRL = 66,
    STDOT = 68,
    CALL = 70,
    UCALL = 72,
    ENDLOOP = 75,
    NOTB = 77,
    PLUSPLUS = 78,
    LT = 83,
    ULT = 87,
    SKIP = 115,
    ENDINIT = 112,
    ARGREF = 97,
    SCONV = 104,
    PCONV = 105,
    PMCONV = 106,
    CBRANCH = 109,
    BRANCH = 114,
    NASSERT = 123,
    MCALL = 132,
};

class ExecTest : public testing::Test {
protected:
    ExecTest() : pkg(*ic_type_package()) {
        if_node_table_init();
        out = open_memstream(&bytes, &size);
        file = I_FILE::if_create(out, &pkg, "unit.c");
        main_fn = function_type({}, pkg.int_t);
        main_sym = global("_main", main_fn);
    }
    ~ExecTest() override { std::free(bytes); }

    TYPE* function_type(const std::vector<TYPE*>& params, TYPE* result) {
        fkPARAM* list = nullptr;
        for (auto it = params.rbegin(); it != params.rend(); ++it) {
            auto* p = new fkPARAM;
            p->type = *it;
            p->next = list;
            list = p;
        }
        TYPE* t = pkg.mk_func(result, false, false, true, 0, 32, 32);
        pkg.set_params(t, list);
        pkg.type_frozen(t);
        return t;
    }
    IC_SYMBOL* symbol(const char* name, TYPE* type, int sclass) {
        symbols.emplace_back(new IC_SYMBOL);
        IC_SYMBOL* s = symbols.back().get();
        s->name = name;
        s->type = type;
        s->size = type->size;
        s->align = type->align;
        s->sclass = static_cast<int8_t>(sclass);
        file->if_reference_type(type);
        return s;
    }
    IC_SYMBOL* global(const char* name, TYPE* type, int sclass = 2) {
        IC_SYMBOL* s = symbol(name, type, sclass);
        file->if_enter_global(s);
        return s;
    }
    IC_SYMBOL* local(const char* name, TYPE* type) {
        IC_SYMBOL* s = symbol(name, type, 1);
        file->if_enter_local(s);
        file->if_write_symbol(s);
        return s;
    }
    IC_NODE* node(int opcode, TYPE* type, IC_NODE* left = nullptr, IC_NODE* right = nullptr) {
        auto* n = new (arena.take(sizeof(IC_NODE))) IC_NODE(&arena);
        n->op = opcode;
        n->type = type;
        n->left = left;
        n->right = right;
        file->if_reference_type(type);
        return n;
    }
    IC_NODE* name(IC_SYMBOL* s) {
        IC_NODE* n = node(NAME, s->type);
        n->sym = s;
        return n;
    }
    IC_NODE* num(int64_t v, TYPE* type) {
        const bool small = v >= INT32_MIN && v <= INT32_MAX;
        IC_NODE* n = node(small ? ICON : LCON, type);
        if (small)
            n->value = v;
        else
            n->text = arena.copy(std::to_string(v).c_str());
        return n;
    }
    IC_NODE* label(uint32_t n) {
        IC_NODE* t = node(LABEL, pkg.int_t);
        t->number = n;
        return t;
    }
    IC_NODE* call(IC_SYMBOL* f, IC_NODE* args) {
        return node(args ? CALL : UCALL, f->type->return_type(), node(UAND, pkg.mk_ptr(f->type), name(f)), args);
    }
    void begin(IC_SYMBOL* f) { file->if_write_begin_func(f, &psn), file->if_write_end_args(&psn); }
    void body() { file->if_write_end_locals(&psn); }
    void statement(IC_NODE* tree) {
        ++psn.line;
        file->if_write_expr(tree, &psn);
    }
    void put(IC_NODE* value) {
        if (!put_i64) put_i64 = global("_put_i64", function_type({pkg.llong_t}, pkg.void_t), 5);
        statement(call(put_i64, node(SCONV, pkg.llong_t, value)));
    }
    void ret(int64_t v) { statement(node(RETURN, pkg.int_t, name(main_sym), num(v, pkg.int_t))); }
    void end() { file->if_write_end_func(&psn); }

    EXEC_RESULT run(EXEC_OPTIONS options = {}) {
        EXPECT_EQ(I_FILE::if_close(file, true, false), 0);
        IC_UNIT unit;
        unit.read(fmemopen(bytes, size, "rb"), &pkg);
        char* text = nullptr;
        size_t length = 0;
        FILE* to = open_memstream(&text, &length);
        options.max_memory = 1 << 16;
        const EXEC_RESULT r = execute(unit, options, to, stderr);
        std::fclose(to);
        printed.assign(text, length);
        std::free(text);
        return r;
    }
    // The unit ends with this status and a message that holds the text.
    void expect_error(int status, const char* text, EXEC_OPTIONS options = {}) {
        const EXEC_RESULT r = run(options);
        EXPECT_TRUE(r.failed);
        EXPECT_EQ(r.status, status) << r.error;
        EXPECT_NE(r.error.find(text), std::string::npos) << r.error;
        EXPECT_NE(r.error.find("in main, line"), std::string::npos) << r.error;
    }

    TYPE_PKG& pkg;
    char* bytes = nullptr;
    size_t size = 0;
    FILE* out = nullptr;
    I_FILE* file = nullptr;
    IC_ARENA arena;
    std::vector<std::unique_ptr<IC_SYMBOL>> symbols;
    IC_SYMBOL *main_sym = nullptr, *put_i64 = nullptr;
    TYPE* main_fn = nullptr;
    PSN psn{"unit.c", 0, 1};
    std::string printed;
};

TEST_F(ExecTest, IntegersWrapAtTheirWidth) {
    TYPE *i = pkg.int_t, *u = pkg.uint_t, *l = pkg.long_t, *ul = pkg.ulong_t, *ll = pkg.llong_t;
    struct {
        int opcode;
        TYPE* type;
        int64_t a, b, expected;
    } const rows[] = {
        {PLUS, i, 32767, 1, -32768},
        {PLUS, u, 65535, 1, 0},
        {PLUS, l, 2147483647, 1, -2147483648LL},
        {MINUS, u, 0, 1, 65535},
        {MULT, i, 256, 256, 0},
        {MULT, l, 65536, 65535, -65536},
        {MULT, ll, 65536, 65536, 4294967296LL},
        {DIV, i, -7, 2, -3},
        {MOD, i, -7, 2, -1},
        {DIV, i, -32768, -1, -32768},
        {DIV, u, 65535, 2, 32767},
        {MOD, ul, -1, 10, 5},
        {SLL, i, 1, 15, -32768},
        {SLL, i, 1, 16, 0},
        {SRL, i, -32768, 15, -1},
        {SRL, i, -4, 40, -1},
        {SRL, u, 32768, 15, 1},
        {SRL, ul, -1, 31, 1},
    };
    global("_put_i64", function_type({pkg.llong_t}, pkg.void_t), 5);
    put_i64 = symbols.back().get();
    begin(main_sym);
    IC_SYMBOL* x = local("x", ll);
    body();
    std::string expected;
    for (const auto& r : rows) {
        // The operand comes from a variable, so that nothing is computed before the run.
        statement(node(ASG, ll, name(x), num(r.a, ll)));
        IC_NODE* right = num(r.b, r.opcode == SLL || r.opcode == SRL ? i : r.type);
        put(node(r.opcode, r.type, node(SCONV, r.type, name(x)), right));
        expected += std::to_string(r.expected) + "\n";
    }
    ret(300);
    end();
    EXPECT_EQ(run().status, 300 & 255);
    EXPECT_EQ(printed, expected);
}

TEST_F(ExecTest, ComparisonsSayTheirSign) {
    put_i64 = global("_put_i64", function_type({pkg.llong_t}, pkg.void_t), 5);
    begin(main_sym);
    body();
    put(node(LT, pkg.int_t, num(-1, pkg.int_t), num(1, pkg.int_t)));
    put(node(ULT, pkg.int_t, num(-1, pkg.int_t), num(1, pkg.int_t)));
    put(node(ULT, pkg.int_t, num(65535, pkg.uint_t), num(65536, pkg.long_t)));
    ret(0);
    end();
    EXPECT_EQ(run().status, 0);
    EXPECT_EQ(printed, "1\n0\n1\n");
}

TEST_F(ExecTest, CountedLoopRunsOnceMoreThanItsCounter) {
    put_i64 = global("_put_i64", function_type({pkg.llong_t}, pkg.void_t), 5);
    begin(main_sym);
    IC_SYMBOL *n = local("n", pkg.uint_t), *sum = local("sum", pkg.int_t);
    body();
    statement(node(ASG, pkg.uint_t, name(n), num(4, pkg.uint_t)));
    statement(node(ASG, pkg.int_t, name(sum), num(0, pkg.int_t)));
    file->if_write_label(1);
    statement(node(PLUSPLUS, pkg.int_t, name(sum), num(1, pkg.int_t)));
    statement(node(ENDLOOP, pkg.uint_t, name(n), label(1)));
    put(name(sum));
    ret(0);
    end();
    EXPECT_EQ(run().status, 0);
    EXPECT_EQ(printed, "5\n");
}

TEST_F(ExecTest, ConditionalBranchJumpsWhenFalse) {
    begin(main_sym);
    body();
    statement(node(CBRANCH, pkg.int_t, num(0, pkg.int_t), label(1)));
    ret(1);
    file->if_write_label(1);
    ret(2);
    end();
    EXPECT_EQ(run().status, 2);
}

TEST_F(ExecTest, UnionTakesOneInitializer) {
    TYPE* u = pkg.mk_union("two", 32, 32, false);
    auto* whole = new fkMDATA("whole", pkg.long_t, 0, 0, 0, false, false, false, false);
    whole->next = new fkMDATA("half", pkg.int_t, 0, 0, 0, false, false, false, false);
    pkg.set_mdata(u, whole);
    pkg.type_frozen(u);
    TYPE* pair = pkg.mk_array(u, false, 2, true);
    IC_SYMBOL* g = global("_g", pair);
    put_i64 = global("_put_i64", function_type({pkg.llong_t}, pkg.void_t), 5);
    begin(main_sym);
    body();
    IC_NODE* second =
        node(PLUS, pkg.mk_ptr(pkg.long_t), node(PCONV, pkg.mk_ptr(pkg.long_t), node(UAND, pkg.mk_ptr(pair), name(g))),
             num(2, pkg.long_t));
    put(node(UMULT, pkg.long_t, second));
    ret(0);
    end();
    g->init = {num(11, pkg.long_t), num(22, pkg.long_t), node(ENDINIT, pkg.int_t)};
    std::vector<BASE_NODE*> items(g->init.begin(), g->init.end());
    file->if_write_init(g);
    for (BASE_NODE* n : items) file->if_write_expr_node(n);
    EXPECT_EQ(run().status, 0);
    EXPECT_EQ(printed, "22\n");
}

TEST_F(ExecTest, DivisionByZeroIsReported) {
    begin(main_sym);
    IC_SYMBOL* x = local("x", pkg.int_t);
    body();
    statement(node(ASG, pkg.int_t, name(x), num(0, pkg.int_t)));
    statement(node(DIV, pkg.int_t, num(1, pkg.int_t), name(x)));
    end();
    expect_error(EXEC_DIVISION, "division by zero");
}

TEST_F(ExecTest, BadAddressesAreReported) {
    begin(main_sym);
    IC_SYMBOL* p = local("p", pkg.mk_ptr(pkg.int_t));
    body();
    statement(node(ASG, p->type, name(p), num(0, p->type)));
    statement(node(UMULT, pkg.int_t, name(p)));
    end();
    expect_error(EXEC_BAD_ADDRESS, "null pointer");
}

TEST_F(ExecTest, UnalignedObjectIsReported) {
    begin(main_sym);
    IC_SYMBOL* p = local("p", pkg.mk_ptr(pkg.long_t));
    body();
    statement(node(ASG, p->type, name(p), num(4097, p->type)));
    statement(node(UMULT, pkg.long_t, name(p)));
    end();
    expect_error(EXEC_UNALIGNED, "unaligned");
}

TEST_F(ExecTest, MissingFunctionIsReported) {
    IC_SYMBOL* f = global("_nowhere", function_type({}, pkg.int_t), 5);
    begin(main_sym);
    body();
    statement(call(f, nullptr));
    end();
    expect_error(EXEC_MISSING, "nowhere");
}

TEST_F(ExecTest, EndlessLoopAndRecursionAreReported) {
    begin(main_sym);
    body();
    file->if_write_label(1);
    statement(node(BRANCH, pkg.int_t, label(1)));
    end();
    EXEC_OPTIONS options;
    options.max_steps = 1000;
    expect_error(EXEC_STEPS, "too many steps", options);
}

TEST_F(ExecTest, RecursionWithoutEndIsAStackOverflow) {
    begin(main_sym);
    local("x", pkg.llong_t);
    body();
    statement(call(main_sym, nullptr));
    end();
    expect_error(EXEC_STACK, "stack overflow");
}

TEST_F(ExecTest, FalseAssertionIsReportedOnRequest) {
    begin(main_sym);
    body();
    statement(node(NASSERT, pkg.int_t, num(0, pkg.int_t)));
    ret(0);
    end();
    EXEC_OPTIONS options;
    options.check = true;
    expect_error(EXEC_CHECK, "asserted", options);
}

TEST_F(ExecTest, MultiplyAccumulateAddsTheProductOfTheLastTime) {
    put_i64 = global("_put_i64", function_type({pkg.llong_t}, pkg.void_t), 5);
    begin(main_sym);
    IC_SYMBOL *acc = local("acc", pkg.long_t), *product = local("product", pkg.long_t);
    body();
    statement(node(ASG, pkg.long_t, name(acc), num(100, pkg.long_t)));
    statement(node(ASG, pkg.long_t, name(product), num(-8, pkg.long_t)));
    TYPE* to_long = pkg.mk_ptr(pkg.long_t);
    IC_NODE* args = num(-300, pkg.int_t);
    for (IC_NODE* next : {num(200, pkg.int_t), node(ARGREF, to_long, name(acc)), node(ARGREF, to_long, name(product)),
                          num(2, pkg.int_t)})
        args = node(COMMA, pkg.int_t, args, next);
    IC_NODE* mac = node(MCALL, pkg.void_t, args);
    mac->text = "__parallel_mpy_sub";
    statement(mac);
    put(name(acc));
    put(name(product));
    ret(0);
    end();
    EXPECT_EQ(run().status, 0);
    EXPECT_EQ(printed, "102\n-60000\n");
}
} // namespace
