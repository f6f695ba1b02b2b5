// The form that references are compared in: an address as a sum of counts of iterations and of invariants.
//
// An induction variable stands for its value on entry to its loop, plus the step times the count of the loop's
// iterations, plus what it was moved by in this iteration; a variable whose value is known at the reference stands for
// that value; an invariant set ahead of the loop for what it was set to. What a loop is entered with and no tree says
// is a value of its own (MIXVALUE).
//
// Needs: the loop hierarchy with its records, trees in normal form, marks of aliased objects.
// Leaves: trees as they are; a record at each UMULT of the blocks of loops and of the function's body.
// Sound because a NAME in the sum is fixed in the loops that are noted with it: what is in two sums stands for one
// value while those iterate. A value known at the reference was assigned on all paths to it in the same iteration, and
// nothing that it reads has been written since. Of a term that is read ahead of a loop each variable must be unchanged
// in that loop; otherwise it is not the variable that is meant but the value that it had. An update of an induction
// variable counts from its own statement on.
#include "OPT5/dd/address_reader.h"

REFERENCE::~REFERENCE() {
    erase_tree(normalized);
    for (NODE* t : made) erase_tree(t);
}

namespace {

// ---- The walk

class WALK {
public:
    explicit WALK(struct LOOP* r) : root(r) {}

    void run() {
        for (struct LOOP* l : loops_outer_first(root)) {
            kept.enter(l);
            if (!l->is_root()) bound_trips(l);
            read_givens(l);
            for (BBLK* bb : l->contents)
                if (bb->loop == l) blocks.push_back(bb);
        }
        std::sort(blocks.begin(), blocks.end(), [](const BBLK* a, const BBLK* b) { return a->dfn < b->dfn; });
        for (BBLK* bb : blocks) walk(bb);
    }

private:
    // The loops around have their bounds.
    void bound_trips(struct LOOP* loop) {
        if (!loop->trips || loop->trips->op == ICON || !loop->trips->type->is_int()) return;
        POINT point;
        point.loop = loop;
        REFERENCE scratch;
        const WIDE most = ADDRESS_READER(&scratch, point, kept, entries).greatest_ahead(loop->trips);
        if (most < NO_LAST) limit_trips(loop, most);
        bound_count(loop);
    }
    // The count of iterations stays below their number, as a sum of what that is computed from.
    void bound_count(struct LOOP* loop) {
        POINT point;
        point.loop = loop;
        GIVEN g;
        ADDRESS_READER reader(g.sum.get(), point, kept, entries);
        LINEAR_FORM& sum = g.sum->sum;
        const NODE* number = loop->trips;
        const int64_t by = divisor_of(&number); // count * by stays below that of the number
        if (!loop->VLCV || !reader.add_number(number, 1, true) || !reader.is_number_of(number->type) ||
            sum.is_constant())
            return;
        NODE* count = mk_NAME(loop->VLCV->sym);
        g.sum->made.push_back(count);
        if (!sum.add(count, -by) || !sum.is_exact) return;
        reader.find_facts();
        const bool ends_at_tail = loop->is_bottom_tested() && !loop->has(LOOP_early_exit);
        g.ranges = {{ends_at_tail ? by : 1 - by, FAR}};
        add_given_for_references(loop, std::move(g));
    }
    // Of a quotient, which the tree becomes the dividend of.
    static int64_t divisor_of(const NODE** t) {
        const NODE* c = (*t)->right;
        if (((*t)->op != DIV && (*t)->op != SRL) || c->op != ICON || c->u.lval < INT65(0) || c->u.lval > INT65(1 << 16))
            return 1;
        const auto v = static_cast<int64_t>(c->u.lval.value);
        const int64_t by = (*t)->op == DIV ? v : v > 16 ? 0 : int64_t(1) << v;
        if (by == 0) return 1;
        *t = (*t)->left;
        return by;
    }

    // ---- What is known

    void read_givens(struct LOOP* loop) {
        constexpr size_t MOST_GIVENS_READ = 16;
        size_t n = 0;
        const auto read = [&](const NODE* fact, bool holds) {
            RELATION r;
            if (++n > MOST_GIVENS_READ || !relation_of(fact, holds, &r) || !is_fixed_in(r.left, loop) ||
                (r.right && !is_fixed_in(r.right, loop)))
                return;
            read_given(r, loop);
        };
        for (const NODE* fact : loop->givens) visit_given(fact, true, MOST_FACT_LEVELS, read);
        if (loop->is_root())
            for (const NODE* fact : currfuninfo->givens) visit_given(fact, true, MOST_FACT_LEVELS, read);
    }
    static bool is_fixed_in(const NODE* t, struct LOOP* loop) {
        return expr_is_constant(t) || tree_is_RC_in_loop(t, loop, false);
    }
    void read_given(const RELATION& r, struct LOOP* loop) {
        POINT point;
        point.loop = loop;
        GIVEN g;
        ADDRESS_READER reader(g.sum.get(), point, kept, entries);
        LINEAR_FORM& sum = g.sum->sum;
        if (!reader.add_number(r.left, 1, false) || (r.right && !reader.add_number(r.right, -1, false))) return;
        const bool is_power_of_2 = (r.modulus & (r.modulus - 1)) == 0;
        if (sum.is_constant() || (!sum.is_exact && !(r.modulus && is_power_of_2))) return;
        g.ranges = r.ranges;
        g.modulus = r.modulus, g.residue = r.residue;
        if (reader.subtracts_addresses) {
            if (g.modulus && !is_power_of_2) return;
            add_wrapped_differences(&g.ranges);
            if (!g.modulus && g.ranges.empty()) return;
        }
        reader.find_facts();
        add_given_for_references(loop, std::move(g));
    }
    // What a difference of 32 bits is, or 2^32 more or less, where the two are so far apart that it wraps.
    static void add_wrapped_differences(std::vector<RANGE>* ranges) {
        if (ranges->empty()) return;
        constexpr WIDE HALF = WIDE(1) << (ADDRESS_BITS - 1);
        const RANGE far_below{-FAR, -HALF}, far_above{HALF, FAR};
        WIDE least_above = FAR, most_below = -FAR;
        for (const RANGE& r : *ranges) {
            if (r.max >= 0) least_above = std::min(least_above, std::max<WIDE>(r.min, 0));
            if (r.min <= 0) most_below = std::max(most_below, std::min<WIDE>(r.max, 0));
        }
        const WIDE up = std::min(least_above, far_above.min), down = std::max(most_below, far_below.max);
        if (up <= down)
            ranges->clear();
        else
            *ranges = {{-FAR, down}, {up, FAR}};
    }
    void walk(BBLK* bb) {
        POINT point;
        point.loop = bb->loop;
        if (const BBLK* before = only_block(bb->predecessors))
            if (auto it = at_end.find(before); it != at_end.end()) point.known = it->second;
        if (!bb->loop->is_root()) {
            if (bb != bb->loop->head) enter_updates_of_head(&point);
            enter_irregular_updates(&point);
        }
        for (const LIST* s = bb->statements; s; s = s->rest) {
            const NODE* t = s->first;
            if (tree_is_arg_prolog(t)) continue;
            point.forget_written(t, true);
            visit(s->first, nullptr, bb, point);
            point.forget_written(t, false);
            if (!bb->loop->is_root()) enter_update(t, &point);
            enter_assignment(t, &point);
        }
        if (!point.known.empty()) at_end[bb] = std::move(point.known);
    }
    // Those of pointers that step in one arm or the other: at which points they have stepped is not asked.
    void enter_irregular_updates(POINT* p) {
        if (!do_dd_for_be) return;
        for (BBLK* bb : p->loop->contents) {
            if (bb->loop != p->loop || bb == p->loop->head || bb == p->loop->tail) continue;
            for (const LIST* s = bb->statements; s; s = s->rest) {
                INDUCTION_UPDATE u;
                if (is_induction_update(s->first, &u) && find_LOOPIV_for_IV(u.sym, p->loop, false))
                    p->moved[u.sym] = std::nullopt;
            }
        }
    }
    static void enter_assignment(const NODE* t, POINT* p) {
        if (t->op != ASG || t->left->op != NAME || p->known.size() >= MOST_KNOWN) return;
        const SYMTAB* sym = t->left->u.sym;
        if (!sym || !only_its_name_reaches(sym) || !same_numbers(t->left->type, sym->type)) return;
        if (!same_numbers(t->right->type, sym->type) || !is_readable(t->right) || sym_appears_in_tree(sym, t->right))
            return;
        p->known.push_back({sym, t->right});
    }

    // `above`: the outermost STDOT of those that the tree stands directly below, or null.
    void visit(NODE* t, NODE* above, BBLK* bb, const POINT& point) {
        if (!t) return;
        if (t->op == STDOT) return visit(t->left, above ? above : t, bb, point);
        visit(t->left, nullptr, bb, point);
        visit(t->right, nullptr, bb, point);
        if (t->op == UMULT && t->left->type->is_pointer()) make(t, above ? above : t, bb, point);
    }
    void make(NODE* umult, NODE* outermost, BBLK* bb, const POINT& point) {
        auto* r = new REFERENCE;
        r->block = bb;
        r->root = outermost;
        r->number = number++;
        ADDRESS_READER(r, point, kept, entries).read_address(umult);
        delete umult->rare().dependence;
        umult->make_rare().dependence = r;
    }

    struct LOOP* root;
    int32_t number = 0;
    std::vector<BBLK*> blocks;
    KEPT_VALUES kept;
    ENTRY_VALUES entries;
    std::unordered_map<const BBLK*, std::vector<ASSIGNED>> at_end; // looked up alone
};

} // namespace

void make_references(struct LOOP* root) {
    allow_work_on_givens();
    keep_symbol_values(true); // statements stay as they are
    WALK(root).run();
    keep_symbol_values(false);
}
