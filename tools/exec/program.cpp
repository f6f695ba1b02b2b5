// The unit as a whole: addresses of objects and functions, initial contents, the entry.
#include "tools/exec/compile.h"

#include <algorithm>
#include <map>

namespace {
enum : int { class_static = 3, class_extern = 5 };

// Behind each object, so that the address one past its end is no other object's.
constexpr uint64_t gap = 1;

bool is_function(const IC_SYMBOL* s) { return s->type && shape_of(s->type).rep == R_FUNC; }

class INITIALIZER {
public:
    INITIALIZER(PROGRAM& program, const IC_SYMBOL* sym) : p(program), items(sym->init), compiler(program, nullptr) {}
    void object(TYPE* type, uint64_t at) {
        if (done()) return;
        TYPE* t = find_type(type)->real;
        if (t->is_array()) return array(t, at);
        if (t->is_csu()) return structure(t, at);
        if (t->is_complex()) {
            const SHAPE part = shape_of(t->part_type());
            scalar(part, at);
            return scalar(part, at + part.units);
        }
        scalar(shape_of(type), at);
    }

private:
    PROGRAM& p;
    const std::vector<IC_NODE*>& items;
    COMPILER compiler;
    size_t next = 0;
    uint32_t skipped = 0; // of the SKIP at `next`

    bool done() const { return next >= items.size() || items[next]->op == op::ENDINIT; }

    // The next scalar's tree, null if it is to stay 0.
    const IC_NODE* take() {
        if (done()) return nullptr;
        const IC_NODE* n = items[next];
        if (n->op != op::SKIP) {
            next++;
            return strip_marks(n);
        }
        if (++skipped >= n->number) {
            next++;
            skipped = 0;
        }
        return nullptr;
    }
    void scalar(const SHAPE& shape, uint64_t at) {
        const IC_NODE* n = take();
        if (n) p.m.store(shape, at, run(compiler.value_as(n, shape), p.m));
    }
    void field(const fkMDATA& m, uint64_t at) {
        const IC_NODE* n = take();
        if (!n) return;
        SHAPE shape = shape_of(m.type);
        const int64_t v = run(compiler.value_as(n, shape), p.m);
        XNODE value, place;
        value.run = place.run = [](const XNODE* x, MACHINE&) { return x->k; };
        value.k = v;
        place.k = static_cast<int64_t>(at) + m.offset / 16;
        XNODE store;
        store.run = bits_store_eval(B_EXPR);
        store.a = &place;
        store.b = &value;
        store.m = static_cast<uint32_t>(m.offset & 15);
        store.n = m.width;
        run(&store, p.m);
    }
    void array(TYPE* t, uint64_t at) {
        TYPE* element = t->raw_elem_type();
        const uint64_t stride = shape_of(element).units;
        uint64_t count = t->num_elem();
        if (!t->is_complete() && stride) count = UINT32_MAX; // as many as there are
        if (items[next]->op == op::SCON && stride) {
            const IC_NODE* text = items[next++];
            for (uint64_t i = 0; i < std::min<uint64_t>(count, text->number); i++)
                p.m.store(shape_of(element), at + i * stride, static_cast<unsigned char>(text->text[i]));
            return;
        }
        for (uint64_t i = 0; i < count && !done(); i++) {
            p.m.check(at + i * stride, 0);
            object(element, at + i * stride);
        }
    }
    void structure(TYPE* t, uint64_t at) {
        for (const fkMDATA* m = t->mdata(); m && !done(); m = m->next) {
            if (m->is_bitfld)
                field(*m, at);
            else
                object(m->type, at + static_cast<uint64_t>(m->offset / 16));
            if (t->is_union()) break;
        }
    }
};
} // namespace

int64_t PROGRAM::refused(const XNODE*, MACHINE& m) {
    m.fail(EXEC_UNSUPPORTED, "cannot execute an operation on operands of such types");
}

uint64_t PROGRAM::take(uint64_t units, uint64_t align_mask) {
    next = (next + align_mask) & ~align_mask;
    const uint64_t at = next;
    if (units > m.size - at) m.fail(EXEC_STACK, "the program's data do not fit in memory");
    next += units;
    return at;
}

uint64_t PROGRAM::text_address(const IC_NODE* scon) {
    const uint64_t at = take(scon->number + uint64_t{1}, 0);
    for (uint32_t i = 0; i < scon->number; i++) m.memory[at + i] = static_cast<unsigned char>(scon->text[i]);
    return at;
}

std::string PROGRAM::bare(const char* name) const {
    return name_prefix && (*name == '_' || *name == '.') ? name + 1 : name;
}

// A node or symbol without a type number is of no type, and everything asks for one.
static void give_types(const IC_UNIT& unit) {
    TYPE* const none = tp->mk_void();
    auto tree = [none](auto&& self, IC_NODE* n) -> void {
        for (; n; n = n->right) {
            if (!n->type) n->type = none;
            self(self, n->left);
        }
    };
    auto symbol = [none](IC_SYMBOL* s) {
        if (!s->type) s->type = none;
    };
    for (const IC_ITEM& item : unit.items)
        if (item.kind == IFR_EXPR) tree(tree, item.tree);
    for (IC_SYMBOL* s : unit.globals) {
        symbol(s);
        for (IC_NODE* n : s->init) tree(tree, n);
    }
    for (const IC_FUNC& f : unit.functions)
        for (IC_SYMBOL* s : f.locals) symbol(s);
}

void PROGRAM::lay_out() {
    give_types(unit);
    m.size = options.max_memory;
    m.memory.assign(m.size, 0);
    std::map<std::string, FUNCTION*> defined;
    for (const IC_FUNC& source : unit.functions) {
        functions.emplace_back();
        FUNCTION& f = functions.back();
        f.sym = source.sym;
        f.source = &source;
        f.name = bare(source.sym->name);
        TYPE* t = source.sym->type->real;
        f.variadic = t->is_func() && t->vararg();
        f.result = t->is_func() ? shape_of(t->return_type()) : int_shape(16, true);
        defined[source.sym->name] = &f;
    }
    std::map<std::string, PLACE> objects;
    std::vector<const IC_SYMBOL*> elsewhere;
    auto enter = [&](const IC_SYMBOL* s) {
        if (is_function(s)) {
            entries[s] = static_cast<int64_t>(function_space + m.callees.size());
            CALLEE c;
            c.name = bare(s->name);
            auto it = defined.find(s->name);
            c.function = it == defined.end() ? nullptr : it->second;
            if (!c.function) c.library = find_library(c.name);
            m.callees.push_back(c);
            return;
        }
        if (s->sclass == class_extern) {
            elsewhere.push_back(s);
            return;
        }
        const SHAPE shape = shape_of(s->type);
        const uint64_t units = std::max<uint64_t>({shape.units, (s->size + 15) / 16, 1});
        uint64_t mask = std::max<uint64_t>(shape.align_mask, 3);
        while (s->align / 16 > mask + 1) mask = mask * 2 + 1;
        places[s] = {B_ABS, static_cast<int64_t>(take(units + gap, mask)), units};
        objects.emplace(s->name, places[s]);
    };
    for (const IC_SYMBOL* s : unit.globals) enter(s);
    for (const IC_FUNC& source : unit.functions)
        for (const IC_SYMBOL* s : source.locals)
            if (s->sclass == class_static || s->sclass == class_extern || is_function(s)) enter(s);
    for (const IC_SYMBOL* s : elsewhere) {
        const std::string name = bare(s->name);
        auto it = objects.find(s->name);
        if (it != objects.end())
            places[s] = it->second;
        else if (name == "errno" || name == "_Errno" || name.find("MCALL_implicit_state") != std::string::npos)
            places[s] = {B_ABS, static_cast<int64_t>(take(4, 3)), 4};
    }
    for (FUNCTION& f : functions)
        for (const IC_SYMBOL* s : f.source->locals)
            if (s->level == 1 && !is_function(s) && s->sclass != class_static && s->sclass != class_extern)
                f.params.push_back({shape_of(s->type), 0});
}

void PROGRAM::initialize() {
    for (const IC_SYMBOL* s : unit.globals) {
        auto it = places.find(s);
        if (!s->init.empty() && it != places.end())
            INITIALIZER(*this, s).object(s->type, static_cast<uint64_t>(it->second.at));
    }
}

void PROGRAM::compile() {
    std::deque<COMPILER> compilers;
    for (FUNCTION& f : functions) {
        compilers.emplace_back(*this, &f);
        compilers.back().function();
    }
}

FUNCTION* PROGRAM::find_main() {
    for (FUNCTION& f : functions)
        if (f.name == "main") return &f;
    return nullptr;
}
