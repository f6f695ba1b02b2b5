// A counter that only counts iterations beside a pointer of the program's own gives its test to that pointer.
//
//     while (n-- > 0) sum += *p++;      end = p + n; while (p != end) sum += *p++;
//
// Needs: loops and live variables. Leaves: those, but that the counter is dead.
// Sound because counter and pointer each step once in each iteration, by constants, so that at the test that leaves the
// pointer has come as many steps as the counter, or one more or less where only one of them steps ahead of the test. It
// was at no earlier test where it is then: its steps are too few to wrap. An unsigned counter may wrap ahead of
// a limit that is met alone, so that its number of steps is no difference; but those where the limit is the last value
// that it can take. A signed counter may step by more than one to a limit that is met alone: the pointer, which steps by a
// multiple, meets its own where the counter does.
#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/symbol_maps.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/dd/inductions.h"
#include "OPT5/scalar/lowering.h"
#include "OPT5/simp/simp.h"

#include <algorithm>

namespace {

// A value's limit in an address takes more statements ahead of the loop than a constant's.
constexpr double COST_OF_CONSTANT = 2, COST_OF_LIMIT = 4;

bool is_one_of(int op, int a, int b, int c, int d) { return op == a || op == b || op == c || op == d; }

class POINTER_TEST {
public:
    POINTER_TEST(NATURAL_LOOPS& all, NATURAL_LOOP* of, LOOP_FACTS& f) : loops(all), loop(of), facts(f) {}

    bool run() {
        for (const LOOP_TEST& candidate : facts.tests()) {
            test = &candidate;
            counter = candidate.counter;
            if (!counter_can_go() || !is_known_count()) continue;
            for (const INDUCTION* i : facts.all_inductions()) {
                pointer = i;
                if (can_carry() && map()) return true;
            }
        }
        return false;
    }

private:
    bool includes_limit() const { return is_one_of(test->stay_op, LE, GE, ULE, UGE); }
    int64_t step() const { return counter->steps.front().by; }
    int64_t stride() const { return pointer->steps.front().by; }

    // Nothing needs it but its step and the test.
    bool counter_can_go() const {
        const int understood = counter->steps.front().statement->op == ASG ? 3 : 2;
        return facts.mentions(counter->sym) == understood && !facts.is_used_after(counter->sym);
    }

    // Whether the number of its steps is a constant, or the distance from its start to its limit.
    bool is_known_count() {
        trips = constant_trip_count(*test, &last);
        if (trips >= 0) return true;
        const TYPE* type = counter->sym->type;
        const int64_t by = step();
        if (test->stay_op == NEQ && type->is_signed() && test->limit->op == NAME) return true; // it is met
        if ((by != 1 && by != -1) || (test->step_comes_first && type->is_unsigned() && test->stay_op != NEQ)) return false;
        if (is_one_of(test->stay_op, ULE, UGE, ULE, UGE) && type->size == 32) return false;
        if (test->stay_op == NEQ && type->is_unsigned()) {
            const INT65 farthest(test->step_comes_first ? -1 : 0);
            return by == -1 && type->size == 16 && test->limit->op == ICON &&
                   truncate_to_type(test->limit->u.lval, tp->int_t) == farthest;
        }
        if (test->limit->op == ICON && !test->limit->u.lval.fits<int32_t>()) return false;
        return test->stay_op == NEQ || is_one_of(test->stay_op, LT, LE, ULT, ULE) == (by == 1);
    }

    bool can_carry() const {
        if (!pointer->sym->type->is_pointer() || pointer->steps.size() != 1 || pointer->steps.front().amount) return false;
        const BBLK* bb = pointer->steps.front().bb;
        if (loops.around(bb) != loop || !loops.dominates_latches(bb, loop)) return false;
        if (!is_private_scalar(pointer->sym)) return false;
        if (trips < 0 && stride() % step() != 0) return false;
        const int64_t size = std::abs(stride());
        const bool is_short = trips >= 0 && trips < 32768;
        return size == 1 || (size < 32768 && (counter->sym->type->size == 16 || is_short));
    }

    // Steps that the pointer has taken at a test beyond those of the counter.
    int64_t lead() const {
        return int64_t(loops.dominates(pointer->steps.front().bb, test->bb)) - int64_t(test->step_comes_first);
    }

    // All ones of a counter that passes 0 are -1.
    int64_t limit_constant() const {
        const bool is_farthest = test->stay_op == NEQ && counter->sym->type->is_unsigned();
        return is_farthest ? -int64_t(test->step_comes_first) : test->limit->u.lval.fits_in<int32_t>();
    }

    NODE* moved(NODE* address, int64_t distance) const {
        if (!distance) return address;
        return maketree(PLUS, address, mk_ICON(INT65(distance), tp->long_t), address->type);
    }

    // The pointer at the first test that leaves, where the counter is `limit` then.
    NODE* end_address() const {
        const int64_t k = stride() / step();
        NODE* start = mk_NAME(pointer->sym);
        LINEAR_ADDRESS end;
        end.base = start;
        NODE* from = mk_NAME(counter->sym);
        if (test->limit->op == ICON)
            end.add_constant(k * limit_constant());
        else
            end.add(test->limit, k);
        if (counter->start_is_known)
            end.add_constant(-k * counter->start);
        else
            end.add(from, -k);
        end.add_constant(stride() * (lead() + includes_limit()));
        NODE* address = tree_of_address(end, start->type);
        erase_tree(from);
        erase_tree(start);
        return address;
    }

    // The limit may lie behind the counter from the start: then the first test leaves.
    NODE* end_or_first(NODE* end) const {
        if (test->stay_op == NEQ || facts.is_guarded(*test)) return end;
        TYPE* type = counter->sym->type->stqs();
        const int64_t ahead_of_test = test->step_comes_first ? step() : 0;
        NODE* value = counter->start_is_known ? mk_ICON(INT65(counter->start + ahead_of_test), type) : mk_NAME(counter->sym);
        if (ahead_of_test && !counter->start_is_known) value = maketree(PLUS, value, mk_ICON(INT65(ahead_of_test), type), type);
        NODE* runs = maketree(test->stay_op, value, copy_tree(test->limit), tp->int_t);
        NODE* at_first = moved(mk_NAME(pointer->sym), stride() * (lead() + test->step_comes_first));
        return simp_tree(maketree(QUEST, runs, maketree(COLON, end, at_first, end->type), end->type), nullptr);
    }

    bool map() {
        const double cost = trips >= 0 ? COST_OF_CONSTANT : COST_OF_LIMIT;
        if (facts.trip_count_estimate() <= cost) return false;
        BBLK* ahead = loops.preheader(loop);
        if (!ahead) return false;
        NODE* end = trips >= 0
                        ? simp_tree(moved(mk_NAME(pointer->sym),
                                          stride() * ((last - counter->start) / step() + lead())), nullptr)
                        : end_or_first(end_address());
        SYMTAB* limit = sym_temp('P', -1, pointer->sym->type->stqs(), nullptr);
        limit->is_loop_limit = end->op == QUEST;
        currfuninfo->spmap->set_bottom(limit);
        insert_at_end_of_body(ahead, mk_ASG(mk_NAME(limit), coerce_to_type(limit->type, end)));
        NODE* compare = test->branch->left;
        const int op = test->stays_if_true ? NEQ : EQ;
        test->branch->left = maketree(op, mk_NAME(pointer->sym), mk_NAME(limit), tp->int_t, compare->ls);
        if (print_debug) {
            debug_printf("\tMapping test %s ", tree_to_infix(compare).c_str());
            debug_printf("into %s\n", tree_to_infix(test->branch->left).c_str());
        }
        erase_tree(compare);
        const INDUCTION::STEP& gone = counter->steps.front();
        LIST** link = &gone.bb->statements;
        while ((*link)->first != gone.statement) link = &(*link)->rest;
        drop_statement(link);
        return true;
    }

    NATURAL_LOOPS& loops;
    NATURAL_LOOP* loop;
    LOOP_FACTS& facts;
    const LOOP_TEST* test = nullptr;
    const INDUCTION *counter = nullptr, *pointer = nullptr;
    int64_t trips = -1, last = 0;
};

} // namespace

bool map_test_to_pointer(NATURAL_LOOPS& all, NATURAL_LOOP* loop, LOOP_FACTS& facts) {
    return facts.is_usable() && POINTER_TEST(all, loop, facts).run();
}
