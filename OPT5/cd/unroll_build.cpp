// Copies of the body of an innermost loop.
//
// Needs: the loop hierarchy, trees in normal form; a body that copies may be made of (`loop_is_OK_for_unrolling`).
// Leaves: blocks to be numbered; the record of the loop is that of the new one but for what it says of variables and
// counts, so that the hierarchy is to be built anew.
// Sound because the statements of the iterations run in their order, each as often as before; only the tests between
// them go, of which it is known how they come out, and a variable's steps in the copies become the last one's. What
// reads the variable in between reads the value that it had, by a sum that the program made as well, step by step. A
// loop that is left in the middle keeps its steps: the variable may be read behind it. Of the copies in what is left
// over each runs once at most. What was found out about pointers at an access, or of dependences, is not copied.
#include "OPT5/cd/unroll_build.h"

#include "OPT5/alias/effects.h"
#include "OPT5/dd/dd.h"
#include "OPT5/dd/inductions.h"
#include "OPT5/dd/loop.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/opcodes.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

#include <algorithm>
#include <unordered_map>

// ---- The body

UNROLLED_BODY::UNROLLED_BODY(struct LOOP* of) : loop(of), blocks(of->contents) {
    std::stable_sort(blocks.begin(), blocks.end(), [of](const BBLK* a, const BBLK* b) {
        return a != b && b != of->head && (a == of->head || a->dfn < b->dfn);
    });
    const NODE* targets = loop->tail->branch()->right;
    BBLK *yes = targets->left->lbl->bblock, *no = targets->right->lbl->bblock;
    stays_if_true = yes == loop->head;
    exit = stays_if_true ? no : yes;
    last = loop->tail;
    if (!loop->has(LOOP_early_exit)) find_steps();
}

size_t UNROLLED_BODY::place_of(const BBLK* bb) const {
    return static_cast<size_t>(std::find(blocks.begin(), blocks.end(), bb) - blocks.begin());
}

// Whether control may pass from one block to the other within an iteration, not through a third one.
bool UNROLLED_BODY::reaches(size_t from, size_t to, size_t without) const {
    std::vector<bool> seen(blocks.size());
    std::vector<size_t> work{from};
    while (!work.empty()) {
        const size_t at = work.back();
        work.pop_back();
        if (at == without) continue;
        if (at == to) return true;
        for (const EDGE* e = blocks[at]->successors; e; e = e->rest) {
            const size_t next = place_of(e->first);
            if (next == blocks.size() || e->first == loop->head || seen[next]) continue;
            seen[next] = true;
            work.push_back(next);
        }
    }
    return false;
}

bool UNROLLED_BODY::runs_always(const BBLK* bb) const {
    return bb == loop->head || bb == loop->tail || !reaches(0, place_of(loop->tail), place_of(bb));
}

// All steps of the copies together are a number of the type.
static bool is_small_step(const VARIABLE_STEP& step) {
    const TYPE* type = step.sym->type;
    if (type->is_pointer() || type->is_unsigned()) return true;
    const INT65 size = step.c.is_negative() ? -step.c : step.c;
    return size <= int_type_max(step.sym->type->stqs()) / INT65(MOST_COPIES_OF_A_BODY);
}

void UNROLLED_BODY::find_steps() {
    std::unordered_map<const SYMTAB*, int> writes; // looked up
    for (size_t b = 0; b < blocks.size(); ++b)
        for (const LIST* s = blocks[b]->statements; s; s = s->rest)
            for_each_written_name(s->first, [&](const NODE* name, const NODE*) { ++writes[name->u.sym]; });
    for (size_t b = 0; b < blocks.size(); ++b)
        for (const LIST* s = blocks[b]->statements; s; s = s->rest) {
            STEPPED v{{}, s->first, b, {}, false, 0};
            if (!read_variable_step(s->first, &v.step) || writes[v.step.sym] != 1) continue;
            const TYPE* type = v.step.sym->type;
            if (!is_private_scalar(v.step.sym) || type->is_volatile() || find_widened_symbol_entry(v.step.sym) ||
                (!type->is_pointer() && !type->is_int()) || type->is_bool() || type->size > 32 ||
                !is_small_step(v.step) || !runs_always(blocks[b]))
                continue;
            const LOOPIV* iv = find_LOOPIV_for_IV(v.step.sym, loop, false);
            v.start_is_known = iv && iv->init && iv->init->op == ICON && type->is_int();
            if (v.start_is_known) v.start = truncate_to_type(iv->init->u.lval, v.step.sym->type->stqs());
            for (size_t other = 0; other < blocks.size(); ++other)
                v.behind.push_back(other != b && reaches(b, other, blocks.size()));
            if (!is_read_often(v)) stepped.push_back(std::move(v));
        }
}

namespace {

// Reads of the variable other than in addresses, where a sum costs nothing.
double value_reads(const SYMTAB* sym, const NODE* t) {
    double n = 0;
    for (; t; t = t->left) {
        if (t->op == UMULT) return n;
        n += t->op == NAME && t->u.sym == sym;
        n += value_reads(sym, t->right);
    }
    return n;
}

} // namespace

// A variable that is read more than once in an iteration steps in each copy: sums would cost more.
bool UNROLLED_BODY::is_read_often(const STEPPED& v) const {
    double reads = 0;
    for (const BBLK* bb : blocks)
        for (const LIST* s = bb->statements; s; s = s->rest)
            if (s->first != v.statement && !(bb == loop->tail && !s->rest))
                reads += value_reads(v.step.sym, s->first) * (runs_always(bb) ? 1 : 0.5);
    return reads >= (blocks.size() > 1 ? 2 : 3);
}

const STEPPED* UNROLLED_BODY::step_of(const SYMTAB* sym) const {
    for (const STEPPED& v : stepped)
        if (v.step.sym == sym) return &v;
    return nullptr;
}

// ---- Statements

namespace {

struct MOVED {
    const STEPPED* by;
    int64_t times;     // steps that it was not given
    const INT65* from; // its value before the first copy; null: not known, or not a constant
};

// A new tree.
NODE* value_of(const MOVED& m) {
    const VARIABLE_STEP& step = m.by->step;
    const INT65 distance = step.c * INT65(m.times);
    return m.from ? mk_ICON(*m.from + distance, step.sym->type->stqs()) : value_behind_step(step, distance);
}

const MOVED* find(const std::vector<MOVED>& moved, const NODE* t) {
    if (t->op != NAME) return nullptr;
    for (const MOVED& m : moved)
        if (m.by->step.sym == t->u.sym) return &m;
    return nullptr;
}

// The value that the tree has behind the steps, which the program made as well: what is signed did not overflow then,
// so that its conversion to a wider type moves as it does.
NODE* behind_steps(NODE* t, const std::vector<MOVED>& moved) {
    if (!t) return nullptr;
    if (const MOVED* m = find(moved, t)) {
        erase_tree(t);
        return value_of(*m);
    }
    if (t->op == SCONV && t->type->is_int() && t->left->type->is_int() && t->left->type->is_signed() &&
        t->type->size > t->left->type->size)
        if (const MOVED* m = find(moved, t->left); m && !m->from)
            return maketree(PLUS, t, mk_integer_constant(m->by->step.c * INT65(m->times), t->type), t->type);
    t->left = behind_steps(t->left, moved);
    t->right = behind_steps(t->right, moved);
    return t;
}

} // namespace

// The statement as copy `k` of `of` has it, null where that has none.
NODE* UNROLLED_BODY::in_copy(const NODE* statement, size_t block, int k, int of) const {
    if (statement->op == NASSERT && (k > 0 || !is_in_loop)) return nullptr;
    std::vector<MOVED> moved;
    const bool is_last = k == of - 1;
    for (const STEPPED& v : stepped) {
        if (v.statement == statement) {
            if (!is_last) return nullptr;
            return mk_ASG(mk_NAME(v.step.sym), value_of({&v, of, known_start(v)}));
        }
        bool is_behind = v.behind[block];
        for (const LIST* s = blocks[block]->statements; v.block == block && s && s->first != statement; s = s->rest)
            is_behind |= s->first == v.statement;
        const int64_t times = is_behind ? (is_last ? 0 : k + 1) : k;
        const INT65* from = known_start(v);
        if ((times || (from && !is_behind)) && sym_appears_in_tree(v.step.sym, statement))
            moved.push_back({&v, times, from});
    }
    NODE* t = strip_ddep_info_from_tree(copy_tree(statement));
    if (moved.empty()) return t;
    t = behind_steps(denormalize_tree(t, false), moved);
    return normalize_tree(simp_tree(t, loop), nullptr);
}

// Of copies that take the loop's place: what it begins with.
const INT65* UNROLLED_BODY::known_start(const STEPPED& v) const {
    return in_place && v.start_is_known ? &v.start : nullptr;
}

// All but the control statement.
LIST* UNROLLED_BODY::statements_of(size_t block, int k, int of) const {
    LIST* list = nullptr;
    LIST** end = &list;
    for (const LIST* s = blocks[block]->statements; s->rest; s = s->rest)
        if (NODE* t = in_copy(s->first, block, k, of)) {
            *end = mkelist(t, nullptr, s->psn);
            (*end)->flag2 = s->flag2;
            end = &(*end)->rest;
        }
    return list;
}

// ---- Blocks

BBLK* UNROLLED_BODY::new_block(struct LOOP* in) {
    BBLK* bb = insert_new_bb(-1, last, nullptr);
    bb->loop = in;
    in->contents.push_back(bb);
    last = bb;
    return bb;
}

UNROLLED_BODY::BLOCKS UNROLLED_BODY::new_blocks(struct LOOP* in) {
    BLOCKS copy;
    for (const BBLK* bb : blocks) {
        copy.push_back(new_block(in));
        copy.back()->first_psn = bb->first_psn;
        copy.back()->last_psn = bb->last_psn;
    }
    return copy;
}

namespace {

void put(BBLK* bb, LIST* list, NODE* control, PSN* psn) {
    LIST** end = &list;
    while (*end) end = &(*end)->rest;
    *end = mkelist(control, nullptr, psn);
    set_statements(bb, list);
    for_each_branch_target(control, [bb](NODE* label) { connect(bb, label->lbl->bblock); });
}

} // namespace

// `control` ends the copy; consumed.
void UNROLLED_BODY::fill(const BLOCKS& copy, int k, int of, NODE* control, PSN* psn) {
    for (size_t b = 0; b < blocks.size(); ++b) {
        const BBLK* from = blocks[b];
        LIST* list = statements_of(b, k, of);
        if (from == loop->tail) {
            put(copy[b], list, control, psn);
            continue;
        }
        LIST* end = mkelist(in_copy(from->branch(), b, k, of), nullptr, from->last_statement()->psn);
        for (size_t to = 0; to < blocks.size(); ++to)
            if (copy[to] != blocks[to]) subst_bb_for_bb_in_stmts(copy[to], blocks[to], end);
        put(copy[b], list, end->first, end->psn);
        end->first = nullptr;
        erase_tree_list_only(end);
    }
}

// The body becomes so many copies, the first of them in its own blocks; `control`, consumed, ends the last one.
void UNROLLED_BODY::replace_body(int count, NODE* control) {
    PSN* psn = loop->tail->last_statement()->psn;
    std::vector<BLOCKS> copies;
    for (int k = 1; k < count; ++k) copies.push_back(new_blocks(loop));
    for (size_t k = 0; k < copies.size(); ++k)
        fill(copies[k], static_cast<int>(k) + 1, count,
             k + 1 < copies.size() ? mk_BRANCH(copies[k + 1].front()) : control, psn);
    const size_t tail = place_of(loop->tail);
    is_in_loop = !in_place;
    std::vector<LIST*> lists;
    for (size_t b = 0; b < blocks.size(); ++b) {
        LIST* list = statements_of(b, 0, count);
        LIST** end = &list;
        while (*end) end = &(*end)->rest;
        if (b != tail)
            *end = mkelist(in_copy(blocks[b]->branch(), b, 0, count), nullptr, blocks[b]->last_statement()->psn);
        lists.push_back(list);
    }
    disconnect(loop->tail, loop->head);
    disconnect(loop->tail, exit);
    for (size_t b = 0; b < blocks.size(); ++b) {
        erase_statements(blocks[b]);
        if (b == tail)
            put(blocks[b], lists[b], mk_BRANCH(copies.front().front()), psn);
        else
            set_statements(blocks[b], lists[b]);
    }
    loop->tail = copies.back()[tail];
}

// ---- The loop

// Control stays in the loop until the control variable is at the end; consumed.
NODE* UNROLLED_BODY::test_of_end(NODE* end) const {
    const TYPE* type = loop->LCV->sym->type;
    const bool is_unsigned = type->is_pointer() || type->is_unsigned();
    const bool goes_down =
        sign_extend_by_type_size(loop->LCV->incrtree->u.lval, loop->LCV->incrtree->type).is_negative();
    // It meets the end, which lets pointers take the test; of an unsigned one it is to be told that it does not wrap.
    int op = loop->test == NEQ || !is_unsigned ? NEQ : goes_down ? (is_unsigned ? UGT : GT) : (is_unsigned ? ULT : LT);
    if (!stays_if_true) op = boolean_inv[op];
    return maketree(op, mk_NAME(loop->LCV->sym), end, tp->int_t);
}

void UNROLLED_BODY::unroll(int factor) {
    NODE* control = in_copy(loop->tail->branch(), place_of(loop->tail), factor - 1, factor);
    replace_body(factor, control);
}

void UNROLLED_BODY::unroll_completely(int count) {
    in_place = true;
    replace_body(count, mk_BRANCH(exit));
}

namespace {

// The largest multiple of the factor that is not above the count; `trips` is borrowed.
NODE* rounded_down(const NODE* trips, int factor) {
    TYPE* type = trips->type->stqs();
    if (power_of_2(INT65(factor)) >= 0) return maketree(ANDB, copy_tree(trips), mk_ICON(INT65(-factor), type), type);
    NODE* over = maketree(MOD, copy_tree(trips), mk_ICON(INT65(factor), type), type);
    return maketree(MINUS, copy_tree(trips), over, type);
}

} // namespace

// What the control variable holds behind the last iteration of copies: it is on its course between the value on entry and the
// one that it has at last, whatever its type; the sum is made in one that wraps.
NODE* UNROLLED_BODY::main_loop_end(const NODE* trips, int factor) {
    SYMTAB* counter = loop->LCV->sym;
    TYPE* type = counter->type->is_pointer() ? tp->long_t : counter->type->stqs();
    INT65 step = sign_extend_by_type_size(loop->LCV->incrtree->u.lval, loop->LCV->incrtree->type);
    const bool goes_down = step.is_negative(), is_pointer = counter->type->is_pointer();
    if (goes_down) step = -step;
    // Where the count fits the variable's type and is the distance, the sum is a number on the course; otherwise it
    // wraps.
    const bool is_exact = step == INT65(1) && trips->type->size == type->size && trips->type->is_signed();
    TYPE* in = is_exact || is_pointer ? type : tp->mk_unsigned(type);
    NODE* full = coerce_to_type(in, rounded_down(trips, factor));
    if (step != INT65(1)) full = maketree(MULT, full, mk_ICON(step, in), in);
    const NODE* init = loop->LCV->init;
    NODE* start = init && init->op == ICON ? mk_ICON(init->u.lval, in)
                                           : coerce_to_type(is_pointer ? counter->type->stqs() : in, mk_NAME(counter));
    TYPE* sum = is_pointer ? counter->type->stqs() : type;
    NODE* end = coerce_to_type(sum, maketree(goes_down ? MINUS : PLUS, start, full, is_pointer ? sum : in));
    end = normalize_tree(simp_tree(end, nullptr), nullptr);
    if (end->op == ICON) return end;
    SYMTAB* limit = sym_temp('d', -1, sum, nullptr);
    insert_at_end_of_body(loop->preheader, mk_ASG(mk_NAME(limit), end));
    return mk_NAME(limit);
}

// So many copies, which control leaves to `behind`; the first block.
BBLK* UNROLLED_BODY::new_part(int count, BBLK* behind) {
    PSN* psn = loop->tail->last_statement()->psn;
    std::vector<BLOCKS> copies;
    for (int k = 0; k < count; ++k) copies.push_back(new_blocks(loop->parent));
    for (size_t k = 0; k < copies.size(); ++k)
        fill(copies[k], static_cast<int>(k), count, mk_BRANCH(k + 1 < copies.size() ? copies[k + 1].front() : behind),
             psn);
    return copies.front().front();
}

// What is left over, by the bits of its number, the largest ahead. Where that begins.
BBLK* UNROLLED_BODY::new_rest(int factor, const REST& rest, const NODE* over) {
    if (rest.count == 0) return exit;
    if (rest.count > 0) return new_part(static_cast<int>(rest.count), exit);
    const bool is_power = power_of_2(INT65(factor)) >= 0;
    BBLK* next = exit;
    for (int bit = 1; bit < factor; bit *= 2) {
        if (is_power && rest.multiple % (2 * bit) == 0) continue;
        last = blocks.back();
        BBLK* test = new_block(loop->parent);
        BBLK* part = new_part(bit, next);
        NODE* is_set = maketree(ANDB, copy_tree(over), mk_ICON(INT65(bit), over->type->stqs()), over->type->stqs());
        put(test, nullptr, mk_IF(is_set, mk_LABELREF_to_bb(part), mk_LABELREF_to_bb(next)),
            loop->tail->last_statement()->psn);
        next = test;
    }
    return next;
}

// The copies run only if the count is enough for them; `otherwise` control passes to that.
void UNROLLED_BODY::guard(const NODE* trips, int factor, BBLK* otherwise) {
    BBLK *ahead = loop->preheader, *made = split_cfg_edge(ahead, loop->head, false);
    made->loop = loop->parent;
    loop->parent->contents.push_back(made);
    loop->preheader = made;
    TYPE* type = trips->type->stqs();
    NODE* enough = maketree(type->is_unsigned() ? UGE : GE, copy_tree(trips), mk_ICON(INT65(factor), type), tp->int_t);
    NODE*& end = ahead->last_statement()->first;
    erase_tree(end);
    end = mk_IF(enough, mk_LABELREF_to_bb(made), mk_LABELREF_to_bb(otherwise));
    connect(ahead, otherwise);
}

NODE* UNROLLED_BODY::kept_ahead(NODE* value) {
    if (value->op == ICON || (value->op == NAME && tree_is_RC_in_loop(value, loop, false))) return value;
    SYMTAB* sym = sym_temp('d', -1, value->type->stqs(), nullptr);
    insert_at_end_of_body(loop->preheader, mk_ASG(mk_NAME(sym), value));
    return mk_NAME(sym);
}

// Where the counter is what is left over's alone behind the loop, pointers may take its place in the loop: a block
// ahead of `behind` in which it gets its value anew.
BBLK* UNROLLED_BODY::counter_at_end(const NODE* end, BBLK* behind) {
    SYMTAB* counter = loop->LCV->sym;
    if (!counter->type->is_int() || !step_of(counter)) return behind;
    last = blocks.back();
    PSN* psn = loop->tail->last_statement()->psn;
    BBLK* made = new_block(loop->parent);
    put(made, mkelist(mk_ASG(mk_NAME(counter), copy_tree(end)), nullptr, psn), mk_BRANCH(behind), psn);
    return made;
}

void UNROLLED_BODY::unroll(int factor, const REST& rest) {
    NODE *trips = kept_ahead(copy_tree(rest.trips)), *over = nullptr;
    const bool is_power = power_of_2(INT65(factor)) >= 0;
    if (rest.count < 0)
        over = is_power ? copy_tree(trips)
                        : kept_ahead(maketree(MOD, copy_tree(trips), mk_ICON(INT65(factor), trips->type->stqs()),
                                              trips->type->stqs()));
    BBLK* behind = new_rest(factor, rest, over);
    if (rest.may_be_less) guard(trips, factor, behind);
    NODE *control = copy_tree(loop->tail->branch()), *end = main_loop_end(trips, factor);
    if (behind != exit) behind = counter_at_end(end, behind);
    erase_tree(control->left);
    control->left = test_of_end(end);
    NODE* to_exit = stays_if_true ? control->right->right : control->right->left;
    if (behind != exit) remap_labelrefs(to_exit, to_exit->lbl, label_of_bb(behind));
    if (over) erase_tree(over);
    erase_tree(trips);
    last = blocks.back();
    replace_body(factor, control);
}
