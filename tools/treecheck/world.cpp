#include "tools/treecheck/world.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/opcodes.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/bif.h"
#include "OPT5/target/target.h"
#include "UTIL/safemem.h"

#include <string>

namespace treecheck {

namespace {

void start_packages() {
    if (!tp) {
        TYPE_PKG::abi = 1;
        tp = new TYPE_PKG;
        TYPE_PKG::init_type_pkg(tp);
        init_opcode_tables();
        init_types();
    }
    cpu_version = 28; // with all built-in functions that there are
    float_support = 11;
    is_fpu64 = true;
    init_BIF_descriptors();
}

SYMTAB* make_symbol(const std::string& name, TYPE* type, int level, int sclass) {
    SYMTAB* s = new SYMTAB;
    s->name = safestrdup(name.c_str());
    s->type = s->orig_type = type;
    s->size = type->size;
    s->align = type->align;
    s->level = level;
    s->sclass = static_cast<int8_t>(sclass);
    return s;
}

class MAKER {
public:
    WORLD w;

    SYMTAB* object(const std::string& name, TYPE* type, int level = 2, int sclass = SC_AUTO) {
        SYMTAB* s = make_symbol(name, type, level, sclass);
        const uint32_t units = static_cast<uint32_t>((type->size + 15) / 16);
        w.end = (w.end + 1) & ~1u;
        s->scratch_word = w.end;
        w.end += units;
        w.objects.push_back(s);
        return s;
    }

    // An object that pointers lead to, with room behind it that is no object's.
    SYMTAB* addressed(const std::string& name, TYPE* type, int level = 2, int sclass = SC_AUTO) {
        SYMTAB* s = object(name, type, level, sclass);
        s->cqual |= CQ_ALIASED;
        s->set_is_aliased(true);
        w.end += 12;
        return s;
    }

    void make_scalars() {
        const std::pair<const char*, TYPE*> types[] = {{"i", tp->int_t},     {"u", tp->uint_t},   {"l", tp->long_t},
                                                       {"ul", tp->ulong_t},  {"ll", tp->llong_t}, {"ull", tp->ullong_t},
                                                       {"c", tp->schar_t},   {"uc", tp->uchar_t}, {"h", tp->short_t},
                                                       {"uh", tp->ushort_t}, {"b", tp->bool_t}};
        for (auto& [name, type] : types) {
            w.integer_types.push_back(type);
            for (const char* n : {"1", "2"}) w.integers.push_back(object(std::string(name) + n, type));
        }
        w.integers.push_back(object("i3", tp->int_t, 2, SC_REGISTER));
        w.integers.push_back(object("e1", tp->mk_enum("sign", tp->int_t, 16, 16, false)));
        w.integers.push_back(object("e2", tp->mk_enum("color", tp->uint_t, 16, 16, false)));
        for (const char* n : {"f1", "f2"}) w.floats.push_back(object(n, tp->float_t));
        for (const char* n : {"d1", "d2"}) w.floats.push_back(object(n, tp->double_t));
        w.globals = {object("gi", tp->int_t, 0, SC_EXTERN), object("gl", tp->long_t, 0, SC_STATIC),
                     object("gu", tp->uint_t, 0, SC_EXTDEF), object("gf", tp->float_t, 0, SC_EXTDEF)};
        for (SYMTAB* s : w.globals) (s->type->is_float() ? w.floats : w.integers).push_back(s);
        w.complexes = {object("z1", tp->mk_complex(tp->float_t)), object("z2", tp->mk_complex(tp->double_t))};
        w.vectors = {object("w1", tp->mk_vector(tp->int_t, false, 2)), object("w2", tp->mk_vector(tp->int_t, false, 4)),
                     object("w3", tp->mk_vector(tp->long_t, false, 2))};
        w.volatiles = {object("v1", tp->mk_qual(tp->int_t, QUAL_VOLATILE)),
                       object("v2", tp->mk_qual(tp->ulong_t, QUAL_VOLATILE), 0, SC_EXTERN)};
    }

    // struct { int a; int x : 5; unsigned y : 3; unsigned z : 1; long b; _Bool t : 1; int w : 12; unsigned long q : 20;
    // }
    void make_record_type() {
        w.record_type = tp->mk_struct("record", 128, 32, false);
        fkMDATA* first = nullptr;
        auto member = [&](const char* name, TYPE* type, int offset, unsigned width) {
            fkMDATA* m = new fkMDATA(name, type, 0, offset, width, false, width != 0, false, false);
            if (w.members.empty())
                first = m;
            else
                w.members.back()->next = m;
            w.members.push_back(m);
        };
        member("a", tp->int_t, 0, 0);
        member("x", tp->int_t, 16, 5);
        member("y", tp->uint_t, 21, 3);
        member("z", tp->uint_t, 24, 1);
        member("b", tp->long_t, 32, 0);
        member("t", tp->bool_t, 64, 1);
        member("w", tp->int_t, 65, 12);
        member("q", tp->ulong_t, 96, 20);
        tp->set_mdata(w.record_type, first);
        tp->type_frozen(w.record_type);
    }

    void make_addressed_objects() {
        w.first_addressed = w.end;
        w.record = addressed("r1", w.record_type);
        w.other_record = addressed("r2", w.record_type, 0, SC_EXTDEF);
        w.array = addressed("arr", tp->mk_array(tp->int_t, false, 8, true), 0, SC_EXTDEF);
        w.addressed = {addressed("ai", tp->int_t), addressed("al", tp->long_t)};
        w.integers.insert(w.integers.end(), w.addressed.begin(), w.addressed.end());
    }

    void make_functions() {
        int n = 0;
        for (const char* name : {"f", "g"}) {
            TYPE* type = tp->mk_func(n ? tp->long_t : tp->int_t, false, false, false, 0, 32, 32);
            tp->type_frozen(type);
            w.functions[n++] = make_symbol(name, type, 0, SC_EXTERN);
        }
    }
};

} // namespace

const WORLD& world() {
    static WORLD* made = nullptr;
    if (made) return *made;
    start_packages();
    init_simplifier();
    if (!currfuninfo) currfuninfo = new FUNINFO("random");
    MAKER m;
    m.make_scalars();
    m.make_record_type();
    m.w.pointers = {m.object("p1", tp->mk_ptr(tp->int_t)), m.object("p2", tp->mk_ptr(tp->int_t)),
                    m.object("p3", tp->mk_ptr(tp->long_t))};
    m.w.record_pointer = m.object("rp", tp->mk_ptr(m.w.record_type));
    m.make_addressed_objects();
    m.make_functions();
    OPT_ASSERT(m.w.end <= MEMORY_UNITS);
    made = new WORLD(m.w);
    return *made;
}

bool WORLD::pointer_may_reach(uint32_t unit, uint32_t units) const {
    if (unit < first_addressed) return false;
    for (auto s = objects.rbegin(); s != objects.rend() && address(*s) >= first_addressed; ++s)
        if (unit >= address(*s)) return unit + units <= address(*s) + (*s)->size / 16;
    return false;
}

} // namespace treecheck
