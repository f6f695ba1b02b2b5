// Short makers of trees for tests, over a type package of its own and one dummy function.
#pragma once

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/opcodes.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "UTIL/safemem.h"

#include <gtest/gtest.h>

#include <string>

namespace test_trees {

inline void start() {
    static bool done = false;
    if (done) return;
    done = true;
    TYPE_PKG::abi = 1;
    tp = new TYPE_PKG;
    TYPE_PKG::init_type_pkg(tp);
    init_opcode_tables();
    init_types();
    currfuninfo = new FUNINFO("f");
}

class Trees : public testing::Test {
protected:
    static void SetUpTestSuite() { start(); }
};

inline SYMTAB* symbol(const char* name, TYPE* type, int level = 2, int sclass = SC_AUTO) {
    SYMTAB* s = new SYMTAB;
    s->name = safestrdup(name);
    s->type = s->orig_type = type;
    s->size = type->size;
    s->align = type->align;
    s->level = level;
    s->sclass = static_cast<int8_t>(sclass);
    return s;
}

inline NODE* name(SYMTAB* s) { return mk_NAME(s); }
inline NODE* icon(long v, TYPE* type = nullptr) { return mk_ICON(INT65(v), type ? type : tp->int_t); }
inline NODE* fcon(const char* text, TYPE* type = nullptr) {
    NODE* t = new_node(FCON, type ? type : tp->double_t);
    t->mk_fcon(text);
    return t;
}
inline NODE* un(int op, NODE* a, TYPE* type = nullptr) { return maketree(op, a, nullptr, type ? type : a->type); }
inline NODE* bin(int op, NODE* a, NODE* b, TYPE* type = nullptr) {
    return maketree(op, a, b, type ? type : operator_type_for_operand_types(op, a->type, b->type, nullptr, nullptr));
}
inline NODE* address(NODE* a) { return maketree(UAND, a, nullptr, tp->mk_ptr(a->type)); }
inline NODE* deref(NODE* p) { return maketree(UMULT, p, nullptr, p->type->type_pointed_to()); }
inline NODE* call(const char* f, TYPE* type, NODE* args = nullptr) {
    TYPE* ft = tp->mk_func(type, false, false, false, 0, 32, 32);
    tp->type_frozen(ft);
    NODE* callee = address(name(symbol(f, ft, 0, SC_EXTERN)));
    return maketree(args ? CALL : UCALL, callee, args, type);
}
inline NODE* member(NODE* object, fkMDATA* m, int op = STDOT) {
    NODE* field = new_node(FIELD, m->type);
    field->mk_field(1, m, object->type->is_pointer() ? object->type->type_pointed_to() : object->type);
    return maketree(op, object, field, m->type);
}
// struct { int a; int bits : 3; long b; }
inline TYPE* sample_struct() {
    static TYPE* made = nullptr;
    if (made) return made;
    TYPE* t = tp->mk_struct("sample", 64, 32, false);
    fkMDATA* a = new fkMDATA("a", tp->int_t, 0, 0, 0, false, false, false, false);
    a->next = new fkMDATA("bits", tp->uint_t, 0, 16, 3, false, true, false, false);
    a->next->next = new fkMDATA("b", tp->long_t, 0, 32, 0, false, false, false, false);
    tp->set_mdata(t, a);
    tp->type_frozen(t);
    return made = t;
}
inline fkMDATA* sample_member(int n) {
    fkMDATA* m = sample_struct()->mdata();
    while (n--) m = m->next;
    return m;
}
inline std::string show(const NODE* t) { return tree_to_infix(t); }

} // namespace test_trees
