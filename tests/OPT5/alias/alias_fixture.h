// A function whose lvalues are asked about.
#pragma once

#include "../ir/function_fixture.h"

#include "OPT5/alias/alias.h"
#include "OPT5/ir/symbol_maps.h"
#include "OPT5/simp/simp.h"

#include <string>

class AliasTest : public FunctionTest {
protected:
    void SetUp() override {
        FunctionTest::SetUp();
        chars_alias_other_types = 1;
        any_unions_in_program = false;
        file_symbols_are_known = true;
    }
    void TearDown() override {
        for (NODE* t : made) erase_tree(t);
        reset_alias_info();
        for (SYMTAB* s : file_symbols) delete s;
        global_symbols = nullptr;
        FunctionTest::TearDown();
    }

    // ---- Symbols
    static TYPE* ptr(TYPE* t) { return tp->mk_ptr(t); }
    static TYPE* array(TYPE* t, unsigned n) { return tp->mk_array(t, false, n, true); }
    SYMTAB* global(const char* name, TYPE* type, int sclass = SC_STATIC, unsigned cqual = CQ_REFERENCED | CQ_ALIASED) {
        SYMTAB* s = make_symbol(name, type, sclass, 0);
        s->cqual = static_cast<uint16_t>(cqual);
        sym_def(s);
        file_symbols.push_back(s);
        return s;
    }
    // The variable that a parameter is copied into; the copy itself stands in the prolog.
    SYMTAB* parameter(const char* name, TYPE* type) {
        SYMTAB* parm = make_symbol(name, type, SC_PARM, 1);
        parm->index = currfuninfo->next_symbol_index++;
        sym_def(parm);
        parm->scope = LS::level_1_scope();
        SYMTAB* copy = local(name, type);
        NODE* asg = mk_ASG(mk_NAME(copy), mk_NAME(parm));
        prolog = prolog ? maketree(PCOMMA, prolog, asg, tp->void_t) : asg;
        return copy;
    }
    // ---- Trees; those that a test asks about are freed at its end
    NODE* keep(NODE* t) {
        made.push_back(t);
        return t;
    }
    static NODE* name(SYMTAB* s) { return mk_NAME(s, LS::current()); }
    static NODE* sum(NODE* a, NODE* b) {
        TYPE* type =
            a->type->is_pointer() ? a->type : operator_type_for_operand_types(PLUS, a->type, b->type, nullptr, nullptr);
        return maketree(PLUS, a, b, type->stqs());
    }
    static NODE* times(NODE* a, long n) { return maketree(MULT, a, icon(n), a->type); }
    static NODE* deref(NODE* p) {
        NODE* t = maketree(UMULT, p, nullptr, p->type->type_pointed_to());
        t->ls = LS::current();
        return t;
    }
    static NODE* address(NODE* a) { return maketree(UAND, a, nullptr, tp->mk_ptr(a->type)); }
    static NODE* start_of(SYMTAB* array) {
        return maketree(UAND, name(array), nullptr, tp->mk_ptr(array->type->raw_elem_type()));
    }
    static NODE* member(NODE* object, int n, int op = STDOT) {
        fkMDATA* m = pair()->mdata();
        if (n) m = m->next;
        NODE* field = new_node(FIELD, m->type);
        field->mk_field(1, m, pair());
        NODE* t = maketree(op, object, field, m->type);
        t->ls = LS::current();
        return t;
    }
    static NODE* call_of(SYMTAB* f, NODE* args = nullptr) {
        return maketree(args ? CALL : UCALL, address(name(f)), args, tp->int_t);
    }
    SYMTAB* function(const char* name, uint64_t flags = 0) {
        SYMTAB* f = global(name, function_type(), SC_EXTERN, CQ_REFERENCED);
        set_flags(make_FUNINFO(f), flags);
        return f;
    }
    void set(SYMTAB* to, NODE* value) { add(maketree(ASG, name(to), value, to->type)); }

    // The statements that were added, with the prolog in front, and what is known of them.
    void analyze() {
        LIST* body = currfuninfo->statements;
        currfuninfo->statements = nullptr;
        if (prolog) add(prolog);
        LIST* last = body;
        while (last && last->rest) last = last->rest;
        if (last) {
            last->rest = currfuninfo->statements;
            currfuninfo->statements = body;
        }
        build();
        init_aliasing_info(true);
    }

    bool may_meet(NODE* a, NODE* b) {
        keep(a);
        keep(b);
        const bool answer = lvalues_may_be_aliased(a, b);
        EXPECT_EQ(answer, lvalues_may_be_aliased(b, a)) << text(a, b);
        return answer;
    }
    static std::string text(const NODE* a, const NODE* b) { return tree_to_infix(a) + " and " + tree_to_infix(b); }
    void expect_meet(NODE* a, NODE* b) { EXPECT_TRUE(may_meet(a, b)) << text(a, b); }
    void expect_apart(NODE* a, NODE* b) { EXPECT_FALSE(may_meet(a, b)) << text(a, b); }

private:
    std::vector<NODE*> made;
    std::vector<SYMTAB*> file_symbols;
    NODE* prolog = nullptr;
};
