// Every operator that writes, times every operator that may stand over a written place: everyone who asks what a
// statement changes must see that it changes the variable below. Trees are made from the opcode table, whatever types
// would say to them, and nothing here asks the code under test which operators those are.

#include "../alias/alias_fixture.h"

#include "OPT5/alias/effects.h"
#include "OPT5/ipa/progana.h"
#include "OPT5/ir/loops.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/scalar/fcp.h"
#include "OPT5/scalar/gcse.h"
#include "OPT5/scalar/gdflow.h"
#include "OPT5/scalar/implied_tests.h"
#include "OPT5/dd/inductions.h"
#include "OPT5/scalar/lcp.h"
#include "OPT5/scalar/lcse.h"
#include "OPT5/dd/merge.h"
#include "OPT5/scalar/rename.h"
#include "OPT5/scalar/simpcfg.h"
#include "OPT5/target/bif.h"

#include <cstring>
#include <functional>

namespace {

constexpr long OLD = 5, NEW = 3;
constexpr int NO_WRAPPER = ILLOP;

// One function with one write in it.
class WORLD : public AliasTest {
public:
    WORLD(int op, int over) : writer(op), wrapper(over) {
        SetUp();
        x = local("x");
        y = local("y");
        z = local("z");
    }
    ~WORLD() override { TearDown(); }
    static void set_up_once() { SetUpTestSuite(); }
    void TestBody() override {}

    const int writer, wrapper;
    SYMTAB *x, *y, *z;
    NODE* written = nullptr; // the write

    // ---- The write of `wrapper(place)`
    NODE* wrapped(NODE* place) const {
        if (wrapper == NO_WRAPPER) return place;
        if (wrapper == STDOT) return member(place, 0);
        NODE* right = number_of_operands[wrapper] == 2 ? copy_tree(place) : nullptr;
        if (wrapper == QUEST) right = maketree(COLON, icon(0), right, tp->int_t);
        return maketree(wrapper, wrapper == QUEST ? icon(1) : place, right, tp->int_t);
    }
    NODE* write_of(NODE* place) {
        written = maketree(writer, wrapped(place), icon(NEW), tp->int_t);
        return written;
    }
    bool writes_whole() const { return wrapper == NO_WRAPPER; }

    // ---- Statements
    void assign_old(SYMTAB* sym = nullptr) { assign(sym ? sym : x, OLD); }
    void hold_place() { assign(z, 77); } // of the write, which comes once there is a graph
    void put_write(NODE* place) { put(write_of(place)); }
    void put(NODE* t) {
        for_each_cell([&](LIST* s) {
            if (s->first->op != ASG || s->first->right->op != ICON || s->first->right->u.lval != INT65(77)) return;
            erase_tree(s->first);
            s->first = t;
        });
    }
    void put_write() { put_write(name(x)); }
    template <class F>
    void for_each_cell(const F& visit) {
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (LIST *s = bb->statements, *next; s; s = next) {
                next = s->rest;
                visit(s);
            }
    }
    NODE* assigned_to(const SYMTAB* sym) {
        NODE* value = nullptr;
        for_each_cell([&](const LIST* s) {
            if (s->first->op == ASG && s->first->left->op == NAME && s->first->left->u.sym == sym) value = s->first->right;
        });
        return value;
    }
    bool holds(const NODE* part) {
        bool found = false;
        for_each_cell([&](const LIST* s) { found |= tree_is_subtree_of_tree(part, s->first); });
        return found;
    }
    // x = OLD; write; y = x; return y
    void build_store_write_load() {
        assign_old();
        hold_place();
        set(y, name(x));
        ret(y);
        build();
        put_write();
    }
    bool old_value_is_read_behind() {
        bool found = false;
        for_each_cell([&](const LIST* s) {
            if (s == currfuninfo->bb_list->statements) return; // the assignment of it
            found |= any_subtree(s->first, [](const NODE* t) { return t->op == ICON && t->u.lval == INT65(OLD); });
        });
        return found;
    }
    using AliasTest::build;
    using AliasTest::global;
    using AliasTest::keep;
    using AliasTest::member;
    using AliasTest::name;
    using FunctionTest::add;
    using FunctionTest::block_of;
    using FunctionTest::branch_if;
    using FunctionTest::define;
    using FunctionTest::go;
    using FunctionTest::local;
    using FunctionTest::ref;
    using FunctionTest::ret;
    static NODE* number(long v) { return icon(v); }
    static NODE* added(NODE* a, NODE* b) { return sum(a, b); }
    static TYPE* structure() { return pair(); }
    void give(SYMTAB* to, NODE* value) { set(to, value); }
};

// By their names in the table.
bool writes(int op) {
    const char* n = node_operator_name[op];
    const size_t length = n ? std::strlen(n) : 0;
    auto ends_in = [n, length](const char* tail) {
        return length >= std::strlen(tail) && !std::strcmp(n + length - std::strlen(tail), tail);
    };
    return ends_in("ASG") || ends_in("LOOP") || op == PLUSPLUS || op == MINMIN;
}

// UMULT and STREF hold a pointer. A call and what only a later form has are no places.
bool may_stand_over_place(int op) {
    if (op == NO_WRAPPER) return true;
    const int operands = node_operator_name[op] ? number_of_operands[op] : 0;
    if (operands != 1 && operands != 2) return false;
    return op != UMULT && op != STREF && op != ICALL && op < DFG_DEF && !writes(op) && op != CALL && op != UCALL &&
           op != MCALL && op != MEMCPY;
}

// `sees` is asked for each pair in a function of its own.
void expect_seen(const char* who, const std::function<bool(WORLD&)>& sees, bool wrappers_alone = false) {
    WORLD::set_up_once();
    init_simplifier();
    int pairs = 0;
    for (int writer = 0; writer < NO_OPCODES; ++writer)
        for (int wrapper = 0; writes(writer) && wrapper < NO_OPCODES; ++wrapper) {
            if (!may_stand_over_place(wrapper) || (wrappers_alone && wrapper == NO_WRAPPER)) continue;
            WORLD w(writer, wrapper);
            EXPECT_TRUE(sees(w)) << who << " overlooks " << opname(writer) << " of " << opname(wrapper);
            ++pairs;
        }
    EXPECT_GT(pairs, 500);
}

TEST(WrittenPlaces, Effects) {
    expect_seen("the alias analysis", [](WORLD& w) {
        w.build_store_write_load();
        init_aliasing_info(false);
        NODE *read = w.keep(w.name(w.x)), *tree = w.keep(w.added(w.name(w.x), w.number(1))),
             *outer = w.keep(mk_ASG(w.name(w.y), copy_tree(w.written)));
        int names = 0;
        for_each_written_name(w.written, [&](const NODE* n, const NODE*) { names += n->u.sym == w.x; });
        return tree_modifies_lvalue(w.written, read) && tree_modifies_lvalue_in_tree(outer, tree) && names > 0 &&
               READ_SET(tree).may_be_changed_by(outer) && tree_acts(w.written);
    });
}

TEST(WrittenPlaces, Superblocks) {
    expect_seen("the superblock", [](WORLD& w) {
        w.build_store_write_load();
        optimize_superblocks_in_cfg();
        return !w.old_value_is_read_behind();
    });
}

TEST(WrittenPlaces, Copies) {
    expect_seen("what assignments in force give", [](WORLD& w) {
        w.build_store_write_load();
        copyprop(1);
        return !w.old_value_is_read_behind();
    });
}

TEST(WrittenPlaces, Constants) {
    expect_seen("the propagation of constants", [](WORLD& w) {
        w.build_store_write_load();
        fast_CP(1, 0);
        return !w.old_value_is_read_behind();
    });
}

// A built-in function writes an operand, `x`, or another variable: then it is known what a second product of x is.
TEST(WrittenPlaces, OperandsOfBuiltins) {
    struct {
        const char* who;
        bool knows_constants;
        void (*run)();
    } const users[] = {{"what assignments in force give", true, [] { copyprop(1); }},
                       {"the propagation of constants", true, [] { fast_CP(1, 0); }},
                       {"the superblock", true, [] { optimize_superblocks_in_cfg(); }},
                       {"common subexpressions of a block", false, [] { lcse(); }},
                       {"those of a function", false, [] { annotate_cfg(), gcse(), clean_up_gdflow_bitvecs(); }}};
    WORLD::set_up_once();
    init_simplifier();
    init_BIF_descriptors();
    for (const auto& user : users)
        for (bool writes_x : {true, false}) {
            WORLD w(ASG, NO_WRAPPER);
            SYMTAB *first = w.local("first"), *second = w.local("second"), *other = w.local("other");
            auto product = [&w] {
                NODE* sum = WORLD::added(w.name(w.x), WORLD::added(w.name(w.z), w.name(w.y)));
                return maketree(MULT, sum, WORLD::number(21), tp->int_t);
            };
            if (user.knows_constants) w.assign_old();
            w.give(first, product());
            w.hold_place();
            w.branch_if(w.y, 1, 2);
            w.define(1);
            w.give(second, product());
            w.ret(second);
            w.define(2);
            w.ret(first);
            w.build();
            NODE* arguments = WORLD::number(0);
            for (NODE* operand : {w.name(other), w.name(writes_x ? w.x : other)})
                arguments = maketree(COMMA, maketree(ARGREF, operand, nullptr, tp->mk_ptr(tp->int_t)), arguments,
                                     tp->int_t);
            for (long factor : {3, 2}) arguments = maketree(COMMA, WORLD::number(factor), arguments, tp->int_t);
            w.put(mk_MCALL("__parallel_mpy_add", arguments, tp->int_t));
            init_aliasing_info(false);
            user.run();
            const NODE* value = w.assigned_to(second);
            const bool reads_x =
                value && any_subtree(value, [&w](const NODE* t) { return t->op == NAME && t->u.sym == w.x; });
            EXPECT_EQ(reads_x, writes_x) << user.who;
        }
}

TEST(WrittenPlaces, KnownParts) {
    expect_seen("what is known of a structure", [](WORLD& w) {
        SYMTAB* s = w.local("s", WORLD::structure());
        w.add(mk_ASG(w.member(w.name(s), 0), w.number(OLD)));
        w.hold_place();
        w.give(w.y, w.member(w.name(s), 0));
        w.ret(w.y);
        w.build();
        w.put_write(w.wrapper == STDOT ? w.name(s) : w.member(w.name(s), 0));
        lcse_subrange_assignments();
        return !w.old_value_is_read_behind();
    });
}

TEST(WrittenPlaces, LaterTests) {
    expect_seen("the search for a deciding test", [](WORLD& w) {
        auto is_great = [&w] { return maketree(GT, w.name(w.x), w.number(OLD), tp->int_t); };
        w.add(mk_IF(is_great(), w.ref(1), w.ref(3)));
        w.define(1);
        w.hold_place();
        w.add(mk_IF(is_great(), w.ref(2), w.ref(3)));
        w.define(2);
        w.assign_old(w.y);
        w.define(3);
        w.ret(w.y);
        w.build();
        w.put_write();
        TEST_OUTCOMES outcomes;
        const BBLK* second = w.block_of(1);
        return outcomes.ask_for(outcomes.control_of(second)->first->left) && outcomes.first_that_may_change(second);
    });
}

TEST(WrittenPlaces, DeadAssignments) {
    expect_seen("the removal of dead assignments", [](WORLD& w) {
        w.hold_place();
        w.ret(w.x);
        w.build();
        w.put_write();
        elim_dead_assigns(true, true);
        return w.holds(w.written);
    });
}

TEST(WrittenPlaces, SingleUses) {
    expect_seen("the move of a value to its use", [](WORLD& w) {
        w.give(w.z, w.name(w.x));
        w.hold_place();
        w.give(w.y, w.added(w.name(w.z), w.number(1)));
        w.ret(w.y);
        w.build();
        w.put_write();
        find_live_variables();
        eliminate_single_use_temps();
        lva_cleanup();
        return !sym_appears_in_tree(w.x, w.assigned_to(w.y));
    });
}

TEST(WrittenPlaces, PromotedAssignments) {
    expect_seen("the promotion of assignments", [](WORLD& w) {
        w.hold_place();
        w.ret(w.y);
        w.build();
        w.put_write();
        BBLK* bb = currfuninfo->bb_list;
        bb->statements->first = mk_ASG(w.name(w.y), maketree(PLUS, w.name(w.x), w.written, tp->int_t));
        init_aliasing_info(false);
        promote_embedded_assignments_in_bb(bb);
        return bb->statements->first->op == ASG && bb->statements->first->left->u.sym == w.y;
    });
}

TEST(WrittenPlaces, Inductions) {
    auto loop_with = [](WORLD& w, bool writes_counter) {
        w.define(1);
        w.add(mk_IF(maketree(LT, w.name(w.y), w.number(100), tp->int_t), w.ref(2), w.ref(3)));
        w.define(2);
        w.hold_place();
        w.add(maketree(PLUSASG, w.name(w.y), w.name(w.x), tp->int_t));
        w.go(1);
        w.define(3);
        w.ret(w.y);
        w.build();
        w.put_write(w.name(writes_counter ? w.y : w.x));
        renumber_bblocks();
        NATURAL_LOOPS loops;
        find_live_variables();
        LOOP_FACTS facts(loops, loops.inner_first().front().get());
        const bool is_induction = facts.is_usable() && facts.induction(w.y);
        const bool is_invariant = facts.is_usable() && facts.is_invariant(w.keep(w.name(writes_counter ? w.y : w.x)));
        lva_cleanup();
        return !is_induction && !is_invariant;
    };
    auto steps = [](const WORLD& w) { // another step of the counter
        return w.writes_whole() &&
               (w.writer == PLUSASG || w.writer == MINUSASG || w.writer == PLUSPLUS || w.writer == MINMIN);
    };
    expect_seen("the amount of a step", [&](WORLD& w) { return loop_with(w, false); });
    expect_seen("the search for inductions", [&](WORLD& w) { return steps(w) || loop_with(w, true); });
}

TEST(WrittenPlaces, Renaming) {
    expect_seen("the renaming of variables", [](WORLD& w) {
        w.assign_old();
        w.give(w.y, w.name(w.x));
        w.assign_old();
        w.hold_place();
        w.give(w.z, w.name(w.x));
        w.give(w.y, w.added(w.name(w.y), w.name(w.z)));
        w.ret(w.y);
        w.build();
        w.put_write();
        NODE* read = w.assigned_to(w.z);
        rename_symbols();
        int names = 0;
        for_each_written_name(w.written, [&](const NODE* n, const NODE*) { names += n->u.sym == read->u.sym; });
        return names > 0;
    });
}

TEST(WrittenPlaces, GlobalsOfTheProgram) {
    expect_seen("the scan of a definition", [](WORLD& w) {
        SYMTAB* g = w.global("g", tp->int_t, SC_STATIC, 0);
        set_flags(currfuninfo, FUN_no_global_asg);
        scan_for_funinfo(w.keep(w.write_of(w.name(g))), true, currfuninfo, false);
        return (g->cqual & CQ_WRITTEN) && !TEST_FLAG(currfuninfo, FUN_no_global_asg);
    });
}

} // namespace
