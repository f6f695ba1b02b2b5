// Pointer steps become part of the memory references beside them, which step address registers for free.
//
// A step `p += c` goes back to the last reference through p, `x = *p; p += 1` to `x = *p++`, also from behind a branch
// that does not concern p; or forward to the next one, `p -= 1; x = *p` to `x = *(p -= 1)`; or around the back edge of
// a loop to its first reference, `do x = *p; while (.. p -= 1 ..)`, where p is then moved ahead of the loop by as much.
//
// Needs: alias marks, embedded assignments promoted. Leaves: the graph, but for exits of loops that it splits.
// Sound because p is a variable that only its name reaches and that no clean-up code names, and the step moves over
// what does not name p, to a reference that is evaluated exactly as often as the step, as the only use of p in its
// statement: not behind `&&`, `||` or in an arm of a choice, and in a block that is reached exactly when the block of
// the step is. A step does not pass a statement that an exception may leave: `catch` may read p.
#include "OPT5/scalar/increments.h"

#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/bif.h"

#include <algorithm>
#include <unordered_set>
#include <vector>

namespace {

constexpr int MOST_BLOCKS_BACK = 10; // by number, between a step and its reference
constexpr int MOST_BLOCKS_FORWARD = 5;
constexpr int MOST_STATEMENTS = 256; // that one step looks at
constexpr size_t MOST_PARTS = 16;    // references through one pointer in front of its step
constexpr int MOST_SPLIT_EXITS = 8;  // of loops; each asks for the graph's facts again

// p = p + c, in units of 16 bits.
struct STEP {
    SYMTAB* p = nullptr;
    long c = 0;
};

bool is_number(const NODE* t, long* value) {
    if (t->op != ICON || !t->u.lval.fits<int32_t>()) return false;
    *value = t->u.lval.fits_in<int32_t>();
    return true;
}

// NAME p + c or NAME p - c.
bool is_sum(const NODE* t, const SYMTAB* p, long* c) {
    if ((t->op != PLUS && t->op != MINUS) || !t->type->is_pointer()) return false;
    if (t->left->op != NAME || t->left->u.sym != p || !is_number(t->right, c)) return false;
    if (t->op == MINUS) *c = -*c;
    return true;
}

bool read_step(const NODE* t, STEP* step) {
    if (!t || !t->left || t->left->op != NAME || !t->type->is_pointer()) return false;
    *step = {t->left->u.sym, 0};
    switch (t->op) {
    case ASG: return compatible_types(t->left->type, t->right->type, true) && is_sum(t->right, step->p, &step->c);
    case PLUSASG:
    case PLUSPLUS: return is_number(t->right, &step->c);
    case MINUSASG:
    case MINMIN:
        if (!is_number(t->right, &step->c)) return false;
        step->c = -step->c;
        return true;
    default: return false;
    }
}

bool is_in_register(const SYMTAB* p, bool forward) {
    if (p->sclass != SC_AUTO && (forward || p->sclass != SC_REGISTER2)) return false;
    return only_its_name_reaches(p) && !p->type->is_volatile() && !sym_appears_in_EHT(p);
}

bool is_power_of_two(long c) { return c > 0 && (c & (c - 1)) == 0; }

// ---- The search for a reference

enum DIRECTION : uint8_t { BACKWARD, FORWARD };

struct USE {
    enum KIND : uint8_t { NONE, BLOCKED, HIT } kind = NONE;
    NODE* umult = nullptr;
};

class SEARCH {
public:
    SEARCH(const STEP& step, DIRECTION direction) : step(step), direction(direction) {}

    USE of(NODE* t, bool is_conditional = false) const {
        if (!t) return {};
        switch (t->op) {
        case NAME: return t->u.sym == step.p ? USE{USE::BLOCKED, nullptr} : USE{};
        case ANDAND:
        case OROR: return both(of(t->left, is_conditional), of(t->right, true));
        case QUEST: return both(of(t->left, is_conditional), of(t->right, true));
        case IF:
        case SWITCH: return of(t->left, is_conditional);
        case UAND:   // an address, no access
        case ASSERT: // nor need these be evaluated
        case NASSERT: return without_hit(of(t->left, is_conditional));
        case UMULT:
            if (!t->right && absorbs(t)) return is_conditional ? USE{USE::BLOCKED, nullptr} : USE{USE::HIT, t};
            break;
        default: break;
        }
        return both(of(t->left, is_conditional), of(t->right, is_conditional));
    }

private:
    static USE without_hit(USE u) {
        if (u.kind == USE::HIT) u = {USE::BLOCKED, nullptr};
        return u;
    }

    static USE both(USE a, USE b) {
        if (a.kind == USE::NONE) return b;
        if (b.kind == USE::NONE) return a;
        return {USE::BLOCKED, nullptr};
    }

    bool absorbs(const NODE* umult) const {
        const NODE* address = umult->left;
        long offset = 0;
        const bool is_plain = address->op == NAME && address->u.sym == step.p;
        if (!is_plain && !is_sum(address, step.p, &offset)) return false;
        const bool fits =
            direction == BACKWARD ? (is_plain ? step.c > 0 : offset == step.c) : (is_plain || offset == -step.c);
        return fits && has_size_of_step(umult->type);
    }

    bool has_size_of_step(const TYPE* t) const {
        const uint64_t bits = static_cast<uint64_t>(step.c < 0 ? -step.c : step.c) * 16;
        if (t->size == bits) return true;
        return !t->is_pointer() && !t->is_vector() && type_stride(t) == bits;
    }

    const STEP step;
    const DIRECTION direction;
};

// ---- The pass

class INCREMENTS {
public:
    explicit INCREMENTS(bool again) : again(again) {}
    void run();
    bool moved_around() const { return is_around; }

private:
    void list_blocks();
    void sweep_backward(BBLK* bb);
    bool moves_backward(size_t at, BBLK* bb, NODE* tree, const STEP& step);
    bool search_before(std::vector<LIST*>& cells, size_t end, const STEP& step, NODE* tree, bool* stop);
    std::vector<LIST*>& cells_of(const BBLK* bb);
    static BBLK* block_in_front(const BBLK* bb, const SYMTAB* p);
    void sweep_forward(BBLK* bb);
    bool moves_forward(BBLK* bb, LIST* cell, const STEP& step);
    USE search_from(BBLK* bb, LIST* cell, const STEP& step, int budget, BBLK** end);
    BBLK* block_behind(const std::vector<BBLK*>& seen, int* budget) const;
    bool moves_around(BBLK* latch, LIST* cell, const STEP& step);
    bool moves_to_only_use(BBLK* bb, NODE* tree, const STEP& step);
    bool moves_in_parts(LIST* first, const LIST* cell, const STEP& step);

    static void absorb_backward(NODE* umult, NODE* tree, const STEP& step);
    static void absorb_forward(NODE* umult, NODE* tree, const STEP& step);
    static bool split_assignment(LIST* cell, const STEP& step, NODE** umult);

    const bool again;
    std::vector<BBLK*> blocks;             // by number
    std::vector<std::vector<LIST*>> cells; // by number, of blocks that were looked at; empty: not known
    int statements_left = 0;
    bool is_around = false;
    bool has_new_temps = false;
    int split_exits = 0;
};

NODE* mk_step(int op, SYMTAB* p, long c) {
    NODE* name = mk_NAME(p);
    return maketree(op, name, mk_ICON(c, tp->long_t), p->type->stqs());
}

NODE* post_step(const STEP& s) { return s.c < 0 ? mk_step(MINMIN, s.p, -s.c) : mk_step(PLUSPLUS, s.p, s.c); }
NODE* plain_step(SYMTAB* p, long c) { return c < 0 ? mk_step(MINUSASG, p, -c) : mk_step(PLUSASG, p, c); }

void set_address(NODE* umult, NODE* address) {
    erase_tree(umult->left);
    umult->left = address;
}

// The tree of the step is taken over or erased.
void INCREMENTS::absorb_backward(NODE* umult, NODE* tree, const STEP& step) {
    const bool is_plain = umult->left->op == NAME;
    set_address(umult, is_plain ? post_step(step) : copy_tree(tree));
    erase_tree(tree);
}

void INCREMENTS::absorb_forward(NODE* umult, NODE* tree, const STEP& step) {
    const bool is_plain = umult->left->op == NAME;
    set_address(umult, is_plain ? copy_tree(tree) : post_step(step));
    erase_tree(tree);
}

// `*p = f(p)` becomes `t = f(p); *p = t`, so that the step behind it has the reference for itself.
bool INCREMENTS::split_assignment(LIST* cell, const STEP& step, NODE** umult) {
    NODE* t = cell->first;
    if (t->op != ASG || !t->type->is_scalar() || t->right->type->is_bool()) return false;
    const USE target = SEARCH(step, BACKWARD).of(t->left);
    if (target.kind != USE::HIT) return false;
    bool writes = false;
    for_each_written_name(t->right, [&](const NODE* name, const NODE*) { writes |= name->u.sym == step.p; });
    if (writes || (cell->rest && tree_is_EH_SWITCH(cell->rest->first))) return false;
    SYMTAB* temp = sym_temp('A', -1, t->right->type->stqs(), nullptr);
    NODE* store = maketree(ASG, t->left, mk_NAME(temp), t->type, t->ls);
    t->left = mk_NAME(temp);
    t->type = temp->type;
    insert_behind(cell, store, cell->psn);
    *umult = target.umult;
    return true;
}

// ---- Backward

// Over the statements in front of `end`, nearest first. `*stop`: one of them concerns p.
bool INCREMENTS::search_before(std::vector<LIST*>& cells, size_t end, const STEP& step, NODE* tree, bool* stop) {
    const SEARCH search(step, BACKWARD);
    for (size_t i = end; i-- > 0;) {
        if (--statements_left < 0) break;
        LIST* cell = cells[i];
        USE use = search.of(cell->first);
        if (use.kind == USE::NONE) continue;
        if (use.kind == USE::BLOCKED && !again && split_assignment(cell, step, &use.umult)) {
            cells.insert(cells.begin() + static_cast<long>(i) + 1, cell->rest);
            use.kind = USE::HIT;
            has_new_temps = true;
        }
        *stop = true;
        if (use.kind == USE::BLOCKED || !rewrite_is_allowed(cell->first)) return false;
        absorb_backward(use.umult, tree, step);
        return true;
    }
    *stop = statements_left < 0;
    return false;
}

std::vector<LIST*>& INCREMENTS::cells_of(const BBLK* bb) {
    std::vector<LIST*>& found = cells[static_cast<size_t>(bb->dfn)];
    if (found.empty())
        for (LIST* s = bb->statements; s; s = s->rest) found.push_back(s);
    return found;
}

bool names(const BBLK* bb, const SYMTAB* p) {
    for (const LIST* s = bb->statements; s; s = s->rest)
        if (sym_appears_in_tree(p, s->first)) return true;
    return false;
}

bool has_two(const EDGE* list) { return list && list->rest && !list->rest->rest; }

// The block from which control comes to this one whatever a branch in between decides, which does not concern p.
BBLK* INCREMENTS::block_in_front(const BBLK* bb, const SYMTAB* p) {
    if (BBLK* front = only_block(bb->predecessors))
        return front->dfn < bb->dfn && only_block(front->successors) == bb ? front : nullptr;
    if (!has_two(bb->predecessors)) return nullptr;
    BBLK *a = bb->predecessors->first, *b = bb->predecessors->rest->first;
    if (a->dfn > b->dfn) std::swap(a, b);
    if (b->dfn >= bb->dfn || only_block(b->successors) != bb || names(b, p)) return nullptr;
    BBLK* front = a;
    if (only_block(a->successors) == bb) { // if-else
        if (names(a, p) || !only_block(a->predecessors) || only_block(a->predecessors) != only_block(b->predecessors)) return nullptr;
        front = a->predecessors->first;
        if (front->dfn >= a->dfn || !has_two(front->successors)) return nullptr;
    } else if (only_block(b->predecessors) != a || !has_two(a->successors))
        return nullptr;
    return front->branch() && front->branch()->op == IF ? front : nullptr;
}

// The step is, or is in, statement `at` of the block.
bool INCREMENTS::moves_backward(size_t at, BBLK* bb, NODE* tree, const STEP& step) {
    if (!again && !is_power_of_two(step.c < 0 ? -step.c : step.c)) return false;
    statements_left = MOST_STATEMENTS;
    bool stop = false;
    for (BBLK* in = bb;;) {
        if (search_before(cells_of(in), at, step, tree, &stop)) return true;
        if (stop) return false;
        BBLK* front = in == blocks.front() ? nullptr : block_in_front(in, step.p);
        if (!front || bb->dfn - front->dfn > MOST_BLOCKS_BACK) return false;
        in = front;
        at = cells_of(in).size();
    }
}

// ---- To the one reference

bool is_setting(const NODE* t, const SYMTAB* p) {
    return t->op == ASG && t->left->op == NAME && t->left->u.sym == p && !sym_appears_in_tree(p, t->right);
}

// What p holds where the loop is left is nobody's business: on each path from there it is set first.
bool is_dead_behind(const NATURAL_LOOPS& loops, const NATURAL_LOOP* loop, const SYMTAB* p) {
    std::vector<const BBLK*> waiting;
    std::unordered_set<const BBLK*> seen; // looked up alone
    auto add = [&](const BBLK* bb) {
        if (seen.insert(bb).second) waiting.push_back(bb);
    };
    for (const BBLK* bb : loop->blocks)
        for (const EDGE* e = bb->successors; e; e = e->rest)
            if (!loops.contains(loop, e->first)) add(e->first);
    while (!waiting.empty()) {
        const BBLK* bb = waiting.back();
        waiting.pop_back();
        bool is_set = false;
        for (const LIST* s = bb->statements; s && !is_set; s = s->rest) {
            if (!s->first || !sym_appears_in_tree(p, s->first)) continue;
            if (!is_setting(s->first, p)) return false;
            is_set = true;
        }
        for (const EDGE* e = is_set ? nullptr : bb->successors; e; e = e->rest) {
            if (loops.contains(loop, e->first)) return false;
            add(e->first);
        }
    }
    return true;
}

// `x = *p` at the start of a loop whose iterations all end in `p += 1`, whatever lies between, if nothing else concerns
// p.
bool INCREMENTS::moves_to_only_use(BBLK* bb, NODE* tree, const STEP& step) {
    if (again) return false;
    need(fact::loops);
    const NATURAL_LOOPS& loops = *currfuninfo->loops;
    const NATURAL_LOOP* loop = loops.around(bb);
    if (!loop || !loops.dominates_latches(bb, loop)) return false;
    const SEARCH search(step, BACKWARD);
    NODE* umult = nullptr;
    const BBLK* at = nullptr;
    for (const BBLK* b : loop->blocks)
        for (const LIST* s = b->statements; s; s = s->rest) {
            if (s->first == tree) break; // p is stepped behind it in any case
            const USE use = s->first ? search.of(s->first) : USE{};
            if (use.kind == USE::BLOCKED || (use.kind == USE::HIT && umult)) return false;
            if (use.kind == USE::HIT) umult = use.umult, at = b;
        }
    if (!umult || umult->left->op != NAME || loops.around(at) != loop || at == bb || !loops.dominates(at, bb))
        return false;
    if (!is_dead_behind(loops, loop, step.p) || !rewrite_is_allowed(tree)) return false;
    absorb_backward(umult, tree, step);
    return true;
}

// ---- In parts

// A reference through p, and how often its statement names p.
struct PART {
    NODE* umult;
    const NODE* statement;
    long offset;
    bool takes_step;
};

// All that the statement does with p is to read and write through it, for certain. Adds those references.
bool list_references(NODE* t, const NODE* statement, const SYMTAB* p, bool is_conditional, std::vector<PART>& found) {
    if (!t) return true;
    if (t->op == NAME) return t->u.sym != p;
    if (t->op == UMULT && !t->right) {
        long offset = 0;
        if ((t->left->op == NAME && t->left->u.sym == p) || is_sum(t->left, p, &offset)) {
            found.push_back({t, statement, offset, false});
            return !is_conditional;
        }
    }
    if (t->op == UAND || t->op == ASSERT || t->op == NASSERT) return !sym_appears_in_tree(p, t);
    const bool guards = t->op == ANDAND || t->op == OROR || t->op == QUEST;
    if (!list_references(t->left, statement, p, is_conditional, found)) return false;
    return t->op == IF || t->op == SWITCH || list_references(t->right, statement, p, is_conditional || guards, found);
}

// `x = *p; y = *(p + 1); p += 2` becomes `x = *p++; y = *p++`: references at the offsets that p has been stepped by
// take a step of their size each, the latest that do. What lies between has p ahead.
bool INCREMENTS::moves_in_parts(LIST* first, const LIST* cell, const STEP& step) {
    if (step.c < 2) return false;
    std::vector<PART> parts;
    for (LIST* s = first; s != cell; s = s->rest) {
        const bool may_be_left = tree_is_EH_SWITCH(s->first) || (s->rest && tree_is_EH_SWITCH(s->rest->first));
        std::vector<PART> own;
        if (may_be_left || !list_references(s->first, s->first, step.p, false, own)) parts.clear(), own.clear();
        parts.insert(parts.end(), own.begin(), own.end());
    }
    if (parts.empty() || parts.size() > MOST_PARTS) return false;
    const long size = static_cast<long>(parts.back().umult->type->size / 16);
    if (size < 1 || step.c % size || step.c == size) return false;
    long wanted = step.c - size;
    for (size_t i = parts.size(); i-- > 0 && wanted >= 0;) {
        PART& part = parts[i];
        const bool shares = (i > 0 && parts[i - 1].statement == part.statement) ||
                            (i + 1 < parts.size() && parts[i + 1].statement == part.statement);
        part.takes_step = !shares && part.offset == wanted && static_cast<long>(part.umult->type->size / 16) == size;
        if (part.takes_step) wanted -= size;
    }
    if (wanted >= 0) return false;
    // No more sums than before: of references, and of the step.
    long ahead = 0, sums = -1;
    for (const PART& part : parts) {
        sums += (part.offset != ahead || part.takes_step) - (part.offset != 0);
        if (part.takes_step) ahead += size;
    }
    if (sums > 0 || !rewrite_is_allowed(cell->first)) return false;
    ahead = 0;
    for (const PART& part : parts) {
        const long offset = part.offset - ahead;
        NODE* address = part.takes_step ? post_step({step.p, size}) : mk_NAME(step.p);
        if (offset) address = maketree(PLUS, address, mk_ICON(INT65(offset), tp->long_t), step.p->type->stqs());
        if (ahead || part.takes_step)
            set_address(part.umult, address);
        else
            erase_tree(address);
        if (part.takes_step) ahead += size;
    }
    return true;
}

void INCREMENTS::sweep_backward(BBLK* bb) {
    for (size_t i = cells_of(bb).size(); i-- > 0;) {
        LIST* cell = cells_of(bb)[i];
        NODE* t = cell->first;
        STEP step;
        const size_t before = cells_of(bb).size();
        if (read_step(t, &step) && is_in_register(step.p, false)) {
            if (moves_backward(i, bb, t, step))
                cell->first = nullptr;
            else if (moves_to_only_use(bb, t, step))
                cell->first = nullptr;
            else if (moves_in_parts(bb->statements, cell, step)) {
                erase_tree(t);
                cell->first = nullptr;
            }
            i += cells_of(bb).size() - before; // what a split added stands in front
            continue;
        }
        // x = (p = p + c)
        const bool is_embedded = t->op == ASG && t->left->op == NAME && read_step(t->right, &step) &&
                                 t->right->op != PLUSPLUS && t->right->op != MINMIN && is_in_register(step.p, true);
        if (!is_embedded || t->left->u.sym == step.p) continue;
        if (moves_backward(i, bb, t->right, step)) t->right = mk_NAME(step.p);
        i += cells_of(bb).size() - before;
    }
    cells[static_cast<size_t>(bb->dfn)].clear();
    drop_empty_cells(&bb->statements);
}

// ---- Forward

// The block behind those seen, all of which lead to it and nowhere else in the end; null if there is none.
BBLK* INCREMENTS::block_behind(const std::vector<BBLK*>& seen, int* budget) const {
    const BBLK* last = seen.back();
    const size_t next = static_cast<size_t>(last->dfn); // numbers begin at 1
    if (*budget <= 0 || next >= blocks.size()) return nullptr;
    BBLK* bb = blocks[next];
    int farthest = 0;
    for (const EDGE* e = last->successors; e; e = e->rest) {
        if (e->first->dfn <= last->dfn) return nullptr;
        farthest = std::max(farthest, e->first->dfn);
    }
    if (!edge_memberp(bb, last->successors) || farthest - last->dfn > *budget) return nullptr;
    for (const EDGE* e = bb->predecessors; e; e = e->rest)
        if (e->first->dfn < seen.front()->dfn || e->first->dfn > last->dfn) return nullptr;
    --*budget;
    return bb;
}

// From `cell` on, over blocks that are reached from here alone. A hit lies in a block that control comes to whatever is
// decided in between. `*end`: the block at whose end the search found nothing; null if it ended before.
USE INCREMENTS::search_from(BBLK* bb, LIST* cell, const STEP& step, int budget, BBLK** end) {
    const SEARCH search(step, FORWARD);
    std::vector<BBLK*> seen{bb};
    int farthest = bb->dfn; // that a block seen leads to
    *end = nullptr;
    for (;;) {
        for (; cell; cell = cell->rest) {
            if (--statements_left < 0) return {USE::BLOCKED, nullptr};
            const USE use = search.of(cell->first);
            const bool may_be_left =
                tree_is_EH_SWITCH(cell->first) || (cell->rest && tree_is_EH_SWITCH(cell->rest->first));
            if (may_be_left || use.kind == USE::BLOCKED) return {USE::BLOCKED, nullptr};
            if (use.kind == USE::HIT) return farthest <= seen.back()->dfn ? use : USE{USE::BLOCKED, nullptr};
        }
        for (const EDGE* e = seen.back()->successors; e; e = e->rest) farthest = std::max(farthest, e->first->dfn);
        BBLK* next = block_behind(seen, &budget);
        if (!next) {
            if (farthest <= seen.back()->dfn || seen.size() == 1) *end = seen.back();
            return {};
        }
        seen.push_back(next);
        cell = next->statements;
    }
}

// ---- The test of a loop

// What `p == limit` compares p with: an address that the loop leaves alone; what holds it. Null if the test is another
// one.
NODE** limit_of(NODE* control, const SYMTAB* p) {
    NODE* t = control->op == IF ? control->left : nullptr;
    if (!t || (t->op != EQ && t->op != NEQ)) return nullptr;
    for (NODE** link : {&t->right, &t->left}) {
        const NODE* other = link == &t->right ? t->left : t->right;
        if (other->op != NAME || other->u.sym != p || !equiv_mtypes(other->type, (*link)->type)) continue;
        const NODE* base = (*link)->op == PLUS && (*link)->right->op == ICON ? (*link)->left : *link;
        const bool is_address = base->op == UAND && base->left->op == NAME;
        if (is_address || (base == *link && base->op == NAME && base->u.sym != p && only_its_name_reaches(base->u.sym)))
            return link;
    }
    return nullptr;
}

// Between the statement and the end of the block only such a test concerns p.
bool concerns_test_alone(const BBLK* bb, const LIST* cell, const SYMTAB* p) {
    for (cell = cell->rest; cell->rest; cell = cell->rest)
        if (sym_appears_in_tree(p, cell->first) || tree_is_EH_SWITCH(cell->first)) return false;
    return limit_of(bb->branch(), p) && !tree_is_EH_SWITCH(cell->first);
}

int mentions_of(const SYMTAB* sym) {
    int count = 0;
    for_each_tree(currfuninfo, [&](const NODE* tree) {
        for_each_subtree(tree, [&](const NODE* n) { count += n->op == NAME && n->u.sym == sym; });
    });
    return count;
}

// The assignment of the block that sets the limit, which nothing but it and the test names; null if there is none.
NODE* setting_of_limit(const BBLK* preheader, const SYMTAB* limit) {
    NODE* setting = nullptr;
    for (const LIST* s = preheader->statements; s; s = s->rest)
        if (assigned_variable(s->first) == limit && s->first->op == ASG) setting = s->first;
    return setting && setting->right->type->is_pointer() && mentions_of(limit) == 2 ? setting : nullptr;
}

bool can_move_limit(BBLK* latch, const BBLK* preheader, const SYMTAB* p) {
    NODE** limit = limit_of(latch->branch(), p);
    return !limit || (*limit)->op != NAME || setting_of_limit(preheader, (*limit)->u.sym);
}

NODE* less(NODE* address, long c) {
    return simp_tree(maketree(MINUS, address, mk_ICON(INT65(c), tp->long_t), address->type), nullptr);
}

// p lags behind by the step where the test reads it.
void move_limit(BBLK* latch, const BBLK* preheader, const STEP& step) {
    NODE** limit = limit_of(latch->branch(), step.p);
    if (!limit) return;
    if ((*limit)->op != NAME) {
        *limit = less(*limit, step.c);
        return;
    }
    NODE* setting = setting_of_limit(preheader, (*limit)->u.sym);
    setting->right = less(setting->right, step.c);
}

bool INCREMENTS::moves_forward(BBLK* bb, LIST* cell, const STEP& step) {
    statements_left = MOST_STATEMENTS;
    BBLK* end = nullptr;
    const USE use = search_from(bb, cell->rest, step, MOST_BLOCKS_FORWARD, &end);
    if (use.kind == USE::HIT) {
        if (!rewrite_is_allowed(cell->first)) return false;
        absorb_forward(use.umult, cell->first, step);
        return true;
    }
    if (use.kind == USE::BLOCKED && concerns_test_alone(bb, cell, step.p)) end = bb;
    return use.kind != USE::HIT && end && !again && moves_around(end, cell, step);
}

// ---- Around a back edge

bool is_set_in(const BBLK* bb, const SYMTAB* p) {
    for (const LIST* s = bb->statements; s; s = s->rest)
        if (is_setting(s->first, p) && !tree_is_arg_prolog(s->first) && s->first->right->type->is_pointer())
            return true;
    return false;
}

// p is moved by -c where the loop is entered.
void set_back(BBLK* preheader, const STEP& step) {
    LIST* last = nullptr;
    for (LIST* s = preheader->statements; s; s = s->rest)
        if (sym_appears_in_tree(step.p, s->first)) last = s;
    NODE* t = last ? last->first : nullptr;
    if (t && t->op == ASG && t->left->op == NAME && t->left->u.sym == step.p && t->right->type->is_pointer() &&
        !tree_is_arg_prolog(t)) {
        t->right = simp_tree(maketree(MINUS, t->right, mk_ICON(step.c, tp->long_t), t->right->type), nullptr);
        return;
    }
    insert_at_end_of_body(preheader, plain_step(step.p, -step.c));
}

// Behind the loop p is what it was: the step is made there, with the next one if that comes first.
void step_behind(BBLK* exit, const NODE* tree, const STEP& step, PSN* psn) {
    for (LIST** link = &exit->statements; *link; link = &(*link)->rest) {
        LIST* cell = *link;
        if (!sym_appears_in_tree(step.p, cell->first)) continue;
        STEP next;
        if (!read_step(cell->first, &next) || next.p != step.p) break;
        if (next.c + step.c == 0) return drop_statement(link);
        erase_tree(cell->first);
        cell->first = plain_step(step.p, next.c + step.c);
        return;
    }
    insert_before(&exit->statements, copy_tree(tree), psn);
}

bool INCREMENTS::moves_around(BBLK* latch, LIST* cell, const STEP& step) {
    if (!has_two(latch->successors) || ends_in_promise(latch)) return false;
    BBLK *header = latch->successors->first, *exit = latch->successors->rest->first;
    if (header->dfn > latch->dfn) std::swap(header, exit);
    if (header->dfn > latch->dfn || header == blocks.front() || !has_two(header->predecessors)) return false;
    BBLK* preheader = header->predecessors->first;
    if (preheader == latch) preheader = header->predecessors->rest->first;
    need(fact::loops);
    const NATURAL_LOOPS& loops = *currfuninfo->loops;
    const NATURAL_LOOP* loop = loops.around(header);
    if (!loop || loop->header != header || preheader == latch || only_block(preheader->successors) != header) return false;
    if (loops.contains(loop, exit) || loops.contains(loop, preheader)) return false;
    if (exit->predecessors->rest && split_exits >= MOST_SPLIT_EXITS) return false;
    BBLK* end = nullptr;
    const USE use = search_from(header, header->statements, step, MOST_BLOCKS_FORWARD + 1, &end);
    if (use.kind != USE::HIT || !can_move_limit(latch, preheader, step.p)) return false;
    const bool needs_more = limit_of(latch->branch(), step.p) || (step.c > 0 && use.umult->left->op == NAME);
    if (needs_more && !(is_set_in(preheader, step.p) && is_dead_behind(loops, loop, step.p))) return false;
    if (!rewrite_is_allowed(cell->first)) return false;
    if (print_debug)
        debug_printf("\n\tBB->DFN [%d-%d] with pre-header %d and exit %d\n"
                     "\tAssignment propagated around back edge of loop: %s\n"
                     "\t(Original assignment has not yet been removed.)\n",
                     header->dfn, latch->dfn, preheader->dfn, exit->dfn, tree_to_infix(cell->first).c_str());
    if (exit->predecessors->rest) {
        exit = split_cfg_edge(latch, exit);
        ++split_exits;
        renumber_bblocks();
        list_blocks();
        changed(fact::alias_marks);
    }
    move_limit(latch, preheader, step);
    step_behind(exit, cell->first, step, cell->psn);
    set_back(preheader, step);
    absorb_forward(use.umult, cell->first, step);
    is_around = true;
    return true;
}

void INCREMENTS::sweep_forward(BBLK* bb) {
    for (LIST** link = &bb->statements; (*link)->rest;) {
        STEP step;
        const bool is_step = read_step((*link)->first, &step) && is_in_register(step.p, !again);
        if (is_step && moves_forward(bb, *link, step)) {
            (*link)->first = nullptr;
            drop_statement(link);
        } else
            link = &(*link)->rest;
    }
}

void INCREMENTS::list_blocks() {
    blocks.clear();
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) blocks.push_back(bb);
}

void INCREMENTS::run() {
    list_blocks();
    cells.resize(blocks.size() + 1);
    for (size_t i = blocks.size(); i-- > 0;) sweep_backward(blocks[i]);
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) sweep_forward(bb);
    if (has_new_temps) sym_split(currfuninfo);
    changed(split_exits ? fact::none : fact::graph);
}

// ---- The reverse

// A reference with a step that may be spelled out.
bool has_own_step(const NODE* umult, STEP* step) {
    if (umult->op != UMULT || umult->right || umult->left->op == NAME) return false;
    return read_step(umult->left, step) && only_its_name_reaches(step->p);
}

struct FOLDED {
    NODE* umult;
    STEP step;
};

// Those of a statement that are evaluated whenever it is, and whose pointer nothing else in it reads.
void find_folded(NODE* t, const NODE* statement, std::vector<FOLDED>& found) {
    if (!t) return;
    STEP step;
    if (has_own_step(t, &step)) {
        const int own = t->left->op == ASG ? 2 : 1;
        if (count_lvalues_in_tree(statement, t->left->left) == own) found.push_back({t, step});
        return;
    }
    find_folded(t->left, statement, found);
    const bool is_conditional = t->op == ANDAND || t->op == OROR || t->op == QUEST;
    if (!is_conditional && t->op != IF && t->op != SWITCH) find_folded(t->right, statement, found);
}

// `x = *(p += c)` becomes `x = *(p + c); p += c`. Where nothing can follow the statement the step is made ahead of it.
void spell_out(const FOLDED& f, LIST** link, LIST* cell, bool nothing_follows) {
    const bool is_post = f.umult->left->op == PLUSPLUS || f.umult->left->op == MINMIN;
    NODE* address = mk_NAME(f.step.p);
    if (is_post == nothing_follows) {
        const long offset = is_post ? -f.step.c : f.step.c;
        address = maketree(PLUS, address, mk_ICON(offset, tp->long_t), f.step.p->type->stqs());
    }
    set_address(f.umult, address);
    NODE* step = plain_step(f.step.p, f.step.c);
    if (nothing_follows)
        insert_before(link, step, cell->psn);
    else
        insert_behind(cell, step, cell->psn);
}

void spell_out_in(BBLK* bb) {
    std::vector<FOLDED> found;
    for (LIST** link = &bb->statements; *link; link = &(*link)->rest) {
        LIST* cell = *link;
        found.clear();
        find_folded(cell->first, cell->first, found);
        const bool nothing_follows =
            cell == bb->last_statement() || (cell->rest && tree_is_EH_SWITCH(cell->rest->first));
        for (const FOLDED& f : found) {
            spell_out(f, link, cell, nothing_follows);
            while (*link != cell) link = &(*link)->rest;
        }
    }
}

// Of those behind loops. What removes dead assignments makes statements of embedded ones.
void remove_dead_steps() {
    spell_out_increments();
    need(fact::live_variables);
    elim_dead_assigns(0, 0);
    need(fact::alias_marks);
    renumber_bblocks();
    INCREMENTS(true).run();
}

void run(bool again) {
    if (opt_level() < 1 || !currfuninfo || !currfuninfo->bb_list) return;
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'propagate_increments' --------\n");
    renumber_bblocks();
    INCREMENTS increments(again);
    increments.run();
    if (increments.moved_around()) remove_dead_steps();
    if (print_debug) debug_printf("\n\n\t\t\t---------- EXITING 'propagate_increments' --------\n");
}

} // namespace

void propagate_increments() { run(false); }
void propagate_increments_again() { run(true); }

void spell_out_increments() {
    if (opt_level() < 1) return;
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) spell_out_in(bb);
}
