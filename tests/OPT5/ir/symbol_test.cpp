#include "function_fixture.h"

#include "OPT5/ir/symbol_table.h"

#include <map>
#include <random>

namespace {

class SymbolTest : public FunctionTest {
protected:
    static bool on(const SYMTAB* s, const SYMTAB* list) { return symbol_in_list(s, list); }
};

TEST_F(SymbolTest, SplitClassifiesByClassAndType) {
    SYMTAB* scalar = local("a");
    SYMTAB* reg = local("r", tp->long_t, SC_REGISTER);
    SYMTAB* vol = local("v", tp->mk_qual(tp->int_t, QUAL_VOLATILE));
    SYMTAB* vol_array = local("va", tp->mk_array(tp->mk_qual(tp->int_t, QUAL_VOLATILE), false, 3, true));
    SYMTAB* array = local("b", tp->mk_array(tp->int_t, false, 4, true));
    SYMTAB* memory = local("m", tp->int_t, SC_MEMORY);
    SYMTAB* parm = local("p", tp->int_t, SC_PARM);
    SYMTAB* gone = make_symbol("g", tp->int_t, SC_DROPPED, 2);
    sym_def(gone);
    EXPECT_EQ(reg->sclass, SC_AUTO) << "entering folds the register classes";
    sym_split(currfuninfo);
    for (const SYMTAB* s : {scalar, reg}) EXPECT_TRUE(on(s, currfuninfo->scalar_syms)) << s->name;
    for (const SYMTAB* s : {vol, vol_array, array, memory, parm}) EXPECT_TRUE(on(s, currfuninfo->memory_syms)) << s->name;
    EXPECT_FALSE(on(gone, currfuninfo->scalar_syms) || on(gone, currfuninfo->memory_syms));
    EXPECT_EQ(currfuninfo->new_syms, nullptr);
    delete gone;
}

TEST_F(SymbolTest, TemporariesAreNamedByLetterAndNumber) {
    SYMTAB* t = sym_temp('T', 12, tp->int_t, nullptr);
    SYMTAB* first = sym_temp('P', -1, tp->mk_qual(tp->long_t, QUAL_CONST), nullptr);
    SYMTAB* second = sym_temp('P', -1, tp->long_t, nullptr);
    EXPECT_STREQ(t->name, "$O$T12");
    EXPECT_STRNE(first->name, second->name);
    EXPECT_NE(first->index, second->index);
    EXPECT_EQ(first->type, tp->long_t) << "a temporary is not const";
    EXPECT_TRUE(t->is_temp && is_internal_symbol(t));
    EXPECT_EQ(t->scope, LS::level_2_scope());
    struct {
        const char* name;
        bool expected;
    } cases[] = {{"$O$T12", true}, {"$O$T", true}, {"$O$L1", true}, {"$O$T12x", false}, {"$O$", false}, {"$O", false},
                 {"$P$T1", false}, {"$O$Q1", false}};
    for (const auto& c : cases) EXPECT_EQ(is_optimizer_temp(c.name, 'T', 'L'), c.expected) << c.name;
}

TEST_F(SymbolTest, DeclarationsFindTheirDefinition) {
    SYMTAB* decl = make_symbol("_x", tp->int_t, SC_EXTERN, 0);
    SYMTAB* other_type = make_symbol("_x", tp->long_t, SC_EXTERN, 0);
    SYMTAB* def = make_symbol("_x", tp->int_t, SC_EXTDEF, 0);
    for (SYMTAB* s : {decl, other_type, def}) sym_def(s);
    EXPECT_EQ(get_sym_def_for_decl(decl), def);
    EXPECT_EQ(get_sym_def_for_decl(other_type), other_type);
    EXPECT_EQ(get_sym_def_for_decl(def), def);
    // One that comes later is found as well.
    SYMTAB* late_decl = make_symbol("_y", tp->int_t, SC_EXTERN, 0);
    SYMTAB* late_def = make_symbol("_y", tp->int_t, SC_EXTDEF, 0);
    sym_def(late_decl);
    EXPECT_EQ(get_sym_def_for_decl(late_decl), late_decl);
    sym_def(late_def);
    EXPECT_EQ(get_sym_def_for_decl(late_decl), late_def);
}

// ---- Initial values

class AutoinitTest : public SymbolTest {
protected:
    static NODE* skip(uint32_t n) {
        NODE* t = new_node(SKIP, tp->int_t);
        t->mk_skip(n);
        return t;
    }
    SYMTAB* object(TYPE* type, std::vector<NODE*> items) {
        SYMTAB* s = make_symbol("_table", type, SC_STATIC, 0);
        items.push_back(new_node(ENDINIT, tp->int_t));
        s->autoinit = new std::vector<NODE*>(items);
        return s;
    }
    static long value_at(const SYMTAB* s, uint64_t bit, TYPE* type, long absent = -1) {
        NODE* t = lookup_autoinit(s, bit, type);
        if (!t) return absent;
        const long v = t->u.lval.fits_in<long>();
        erase_tree(t);
        return v;
    }
};

TEST_F(AutoinitTest, ArraysAndSkips) {
    SYMTAB* s = object(tp->mk_array(tp->int_t, false, 6, true), {icon(10), skip(2), icon(13), icon(14)});
    EXPECT_EQ(value_at(s, 0, tp->int_t), 10);
    EXPECT_EQ(value_at(s, 16, tp->int_t), -1) << "skipped";
    EXPECT_EQ(value_at(s, 48, tp->int_t), 13);
    EXPECT_EQ(value_at(s, 64, tp->int_t), 14);
    EXPECT_EQ(value_at(s, 80, tp->int_t), -1) << "the list has ended";
    EXPECT_EQ(value_at(s, 8, tp->int_t), -1) << "inside an element";
    EXPECT_EQ(value_at(s, 0, tp->long_t), -1) << "another width";
    NODE* t = lookup_array_autoinit(s, 4);
    ASSERT_NE(t, nullptr);
    EXPECT_EQ(t->u.lval, INT65(14));
    erase_tree(t);
    EXPECT_EQ(lookup_array_autoinit(s, 6), nullptr);
    auto* weak = new PRAGMA;
    weak->kind = PRG_WEAK;
    s->pragma = weak;
    EXPECT_EQ(value_at(s, 0, tp->int_t), -1) << "another definition may win";
    delete s;
}

TEST_F(AutoinitTest, StructuresInLayoutOrderAndNothingBehindAUnion) {
    TYPE* pair = this->pair();
    SYMTAB* s = object(tp->mk_array(pair, false, 2, true),
                       {icon(1), icon(70000, tp->long_t), icon(2), icon(80000, tp->long_t)});
    EXPECT_EQ(value_at(s, 32, tp->long_t), 70000);
    EXPECT_EQ(value_at(s, 64, tp->int_t), 2);
    EXPECT_EQ(value_at(s, 96, tp->long_t), 80000);
    NODE* field = new_node(FIELD, tp->long_t);
    field->mk_field(1, pair->mdata()->next, tp->mk_qual(pair, QUAL_CONST));
    EXPECT_EQ(field->field_csu(), pair) << "who reads the file looks for the member in the structure itself";
    NODE* object_ref = mk_NAME(s);
    object_ref->type = pair;
    NODE* tree = maketree(STDOT, object_ref, field, tp->long_t);
    NODE* t = lookup_autoinit(tree);
    ASSERT_NE(t, nullptr);
    EXPECT_EQ(t->u.lval, INT65(70000));
    erase_tree(t);
    erase_tree(tree);
    delete s;

    TYPE* either = tp->mk_union("either", 32, 32, false);
    tp->set_mdata(either, new fkMDATA("i", tp->int_t, 0, 0, 0, false, false, false, false));
    tp->type_frozen(either);
    s = object(either, {icon(1)});
    EXPECT_EQ(value_at(s, 0, tp->int_t), -1);
    delete s;
}

TEST_F(AutoinitTest, AStringFillsItsArray) {
    NODE* text = new_node(SCON, tp->mk_ptr(tp->schar_t));
    text->mk_scon("ab", 3);
    SYMTAB* s = object(tp->mk_array(tp->schar_t, false, 5, true), {text});
    EXPECT_EQ(value_at(s, 16, tp->schar_t), 'b');
    EXPECT_EQ(value_at(s, 64, tp->schar_t), 0);
    delete s;
}

// ---- Function records

class FuninfoTest : public SymbolTest {};

TEST_F(FuninfoTest, SystemFunctionsAreKnownByName) {
    EXPECT_EQ(find_FUNINFO("xyz_unknown"), nullptr);
    FUNINFO* abs = find_FUNINFO("abs");
    ASSERT_NE(abs, nullptr);
    EXPECT_TRUE(TEST_FLAG(abs, FUN_is_SYSTEM) && TEST_FLAG(abs, FUN_is_pure_fun) && TEST_FLAG(abs, FUN_no_ind_use));
    EXPECT_FALSE(function_is_defined(abs));
    struct {
        const char* name;
        uint64_t has, lacks;
    } cases[] = {
        {"strlen", FUN_no_global_asg | FUN_no_ind_asg | FUN_no_byref_asg, FUN_is_pure_fun | FUN_no_ind_use},
        {"memset", FUN_no_ind_use, FUN_no_ind_asg},
        {"malloc", FUN_no_ind_asg | FUN_no_ind_use, FUN_is_pure_fun},
        {"longjmp", FUN_never_returns, FUN_no_global_asg},
        {"qsort", FUN_is_SYSTEM, FUN_no_global_use},
        {"exit", FUN_never_returns, FUN_no_global_use}, // handlers of the program run in it
        {"main", FUN_is_main, FUN_is_SYSTEM},
    };
    for (const auto& c : cases) {
        FUNINFO* f = make_FUNINFO(c.name);
        EXPECT_EQ(get_flags(f) & c.has, c.has) << c.name;
        EXPECT_EQ(get_flags(f) & c.lacks, 0u) << c.name;
    }
}

// A program's own `abort` may well return.
TEST_F(FuninfoTest, ADefinitionOfTheProgramIsNoSystemFunction) {
    SYMTAB* own = make_symbol("_abort", function_type(), SC_EXTDEF, 0);
    own->location = 55;
    EXPECT_FALSE(TEST_FLAG(make_FUNINFO(own), FUN_is_SYSTEM | FUN_never_returns));
    find_FUNINFO("tolower");
    SYMTAB* named_before = make_symbol("_tolower", function_type(), SC_STATIC, 0);
    named_before->location = 77;
    EXPECT_FALSE(TEST_FLAG(make_FUNINFO(named_before), FUN_is_SYSTEM | FUN_is_pure_fun));
}

TEST_F(FuninfoTest, UnsuppressionBringsAFunctionBackOnce) {
    SYMTAB* sym = make_symbol("_inl", function_type(), SC_STATIC, 0);
    sym->location = 9;
    FUNINFO* f = make_FUNINFO(sym);
    unsuppress_inline_function(f);
    EXPECT_TRUE(unsuppressed_functions.empty()) << "it was not suppressed";
    set_flags(f, FUN_is_suppressed);
    unsuppress_inline_function(f);
    ASSERT_EQ(unsuppressed_functions.size(), 1u);
    EXPECT_TRUE(TEST_FLAG(f, FUN_cannot_suppress) && TEST_FLAG(f, FUN_is_unsuppressed));
    EXPECT_FALSE(TEST_FLAG(f, FUN_is_suppressed));
    set_flags(f, FUN_is_suppressed);
    unsuppress_inline_function(f);
    EXPECT_EQ(unsuppressed_functions.size(), 1u);
    unsuppressed_functions.clear();
    SYMTAB* done = make_symbol("_done", function_type(), SC_STATIC, 0);
    done->location = 9;
    set_flags(make_FUNINFO(done), FUN_is_suppressed | FUN_is_processed);
    unsuppress_inline_function(make_FUNINFO(done));
    EXPECT_TRUE(unsuppressed_functions.empty());
}

// ---- Scopes

TEST_F(SymbolTest, ScopesNestAndHoldTheirSymbolsInOrder) {
    SYMTAB* a = local("a");
    SYMTAB* b = local("b");
    SYMTAB* p = local("p", tp->mk_ptr(tp->int_t));
    LS* outer = LS::current();
    LS::open(nullptr, currfunc, 7);
    LS* inner = LS::current();
    SYMTAB* c = local("c");
    EXPECT_EQ(c->scope, inner);
    EXPECT_EXIT(LS::close(nullptr, currfunc, 8), testing::ExitedWithCode(1), "");
    LS::close(nullptr, currfunc, 7);
    LS::open(nullptr, currfunc, 7);
    LS* sibling = LS::current();
    LS::close(nullptr, currfunc, 7);
    LS::close(nullptr, currfunc, 0);
    EXPECT_EQ(outer->scalars->sym, a);
    EXPECT_EQ(outer->scalars->next->sym, b);
    EXPECT_EQ(outer->pointers->sym, p);
    EXPECT_EQ(LS::level_2_scope(), outer);
    EXPECT_EQ(LS::innermost_common_scope(inner, sibling), outer);
    EXPECT_TRUE(outer->encloses(inner) && !inner->encloses(outer) && inner->is_strictly_contained_by(outer));
    EXPECT_FALSE(LS::object_may_be_live_in_scope(c, sibling));
    EXPECT_TRUE(LS::object_may_be_live_in_scope(a, sibling));
    currfuninfo->ls_root->validate();
}

// ---- Tables

TEST_F(SymbolTest, ATableHoldsWhatAMapHolds) {
    std::vector<SYMTAB*> symbols{nullptr};
    for (int i = 0; i < 400; ++i) symbols.push_back(make_symbol("t", tp->int_t, SC_AUTO, 2));
    std::mt19937 random(1);
    SYMBOL_TABLE<int> table;
    for (int size : {1, 401, 20, 150}) { // cleared in between, with its room kept
        std::map<const SYMTAB*, int> map;
        table.clear();
        for (int i = 0; i < 1000; ++i) {
            const SYMTAB* sym = symbols[random() % size * 7 % symbols.size()]; // numbers far apart
            ASSERT_EQ(table.find(sym) != nullptr, map.count(sym) != 0);
            ASSERT_EQ(table[sym], map[sym]);
            table[sym] = map[sym] = i;
        }
        for (const SYMTAB* sym : symbols) {
            const int* value = table.find(sym);
            ASSERT_EQ(value ? *value : -1, map.count(sym) ? map[sym] : -1);
        }
    }
}

} // namespace
