// Blocks as records: fall-through takes the place of branches, an IF becomes the format's conditional branch.

#include "OPT5/io/write.h"

#include "IFILE/ifile.h"
#include "OPT5/io/read.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/target.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <cstring>

namespace {

constexpr char NEVER_EXECUTED[] = "_never_executed";

bool is_never_executed(const NODE* t) { return t->op == UMCALL && !std::strcmp(t->u.name, NEVER_EXECUTED); }

// ---- Vector moves of one lane

NODE* lower_lane_move(NODE* t) {
    if (t->op != ICALL) return t;
    const bool repack = !std::strcmp(t->u.name, "__repack");
    if (!repack && std::strcmp(t->u.name, "__s2v") && std::strcmp(t->u.name, "__v2s")) return t;
    NODE* operand = t->left;
    if (operand->op == ICON) {
        operand->type = t->type;
        t->left = nullptr;
        erase_node(t);
        return operand;
    }
    NODE* cast = maketree(repack ? SCONV : VRCONV, operand, nullptr, t->type, t->ls);
    t->left = nullptr;
    erase_node(t);
    return cast;
}

// ---- Spin blocks

bool spins_on_itself(const BBLK* bb) {
    if (!bb->statements || bb->statements->first->op != BRANCH) return false;
    const LBL* target = bb->statements->first->left->lbl;
    return target && target->bblock == bb && edge_length(bb->predecessors) == 2;
}

bool call_never_returns(const NODE* t) {
    FUNINFO* callee = op_is_call(t->op) ? find_FUNINFO_for_call(t) : nullptr;
    return callee && TEST_FLAG(callee, FUN_never_returns);
}

// A block that only spins behind a call that never returns is not reached.
void empty_unreached_spins(FUNINFO* f) {
    for (BBLK* bb = f->bb_list->dflink; bb; bb = bb->dflink) {
        if (!spins_on_itself(bb)) continue;
        const EDGE* e = bb->predecessors;
        const BBLK* pred = e->first == bb ? e->rest->first : e->first;
        if (only_block(pred->successors) != bb) continue;
        const NODE* last_real = nullptr;
        for (const LIST* s = pred->statements; s; s = s->rest) {
            if (s->first->op == BRANCH && s != pred->statements) {
                if (last_real && call_never_returns(last_real)) {
                    erase_tree_list(bb->statements);
                    bb->statements = nullptr;
                }
                break;
            }
            if (!tree_is_ASM_comment(s->first)) last_real = s->first;
        }
    }
}

// ---- Rewriting the statements of a block

class BLOCK_WRITER {
public:
    explicit BLOCK_WRITER(BBLK* block) : bb(block) {}

    void run() {
        for (LIST* s = bb->statements; s; s = s->rest) rewrite(s);
        for (LIST* s = bb->statements; s; s = s->rest)
            if (!write(s)) break;
    }

private:
    const BBLK* next_block() const { return bb->dflink; }
    static const BBLK* target(const NODE* ref) { return ref->lbl->bblock; }

    void rewrite(LIST* s) {
        if (tree_is_EH_SWITCH(s->first))
            rewrite_dispatch(s);
        else if (s->first->op == IF)
            rewrite_IF(s);
        else if (is_never_executed(s->first)) {
            erase_tree_list(s->rest);
            s->rest = nullptr;
        }
    }

    // The dispatch did its work while the function was optimized: the handlers are found through the table.
    void rewrite_dispatch(LIST* s) {
        NODE* sw = s->first;
        if (sw->right->op != COMMA || sw->right->right->op != DEFAULT) abort_optimizer();
        update_eht_labels(sw, false);
        NODE* dflt = sw->right->right;
        NODE* branch = maketree(BRANCH, dflt->left, nullptr, tp->int_t, sw->ls);
        dflt->left = nullptr;
        erase_tree(sw);
        s->first = branch;
    }

    void rewrite_IF(LIST* s) {
        NODE* t = s->first;
        if (t->left->op == ENDLOOP) {
            NODE* end = t->left;
            NODE* exit = t->right->right;
            t->left = nullptr;
            t->right->right = nullptr;
            s->rest = mkelist(maketree(BRANCH, exit, nullptr, tp->int_t, t->ls), s->rest, s->psn);
            erase_tree(t);
            s->first = end;
            return;
        }
        NODE* targets = t->right;
        if (!t->left->type->is_int()) t->left = make_boolean(t->left, nullptr);
        const BBLK *l = target(targets->left), *r = target(targets->right), *next = next_block();
        if (r == next || (l != next && l->dfn < r->dfn)) {
            std::swap(targets->left, targets->right);
            t->left = negate(t->left);
        }
        NODE* if_true = targets->left;
        t->right = targets->right;
        erase_node(targets);
        t->op = CBRANCH;
        revert_CBRANCH_with_builtin_expect(t);
        s->rest = mkelist(maketree(BRANCH, if_true, nullptr, tp->int_t, t->ls), s->rest, s->psn);
    }

    static NODE* negate(NODE* cond) {
        cond = simp_for_control(simp_node(mk_EXCLAIM(cond), nullptr), nullptr);
        if (cond->op == EQ && cond->right->op == ICON && cond->right->u.lval.is_zero() && cond->left->type->is_int()) {
            erase_tree(cond->right);
            cond->right = nullptr;
            cond->op = EXCLAIM;
        }
        return cond;
    }

    // False ends the block.
    bool write(LIST* s) {
        const NODE* t = s->first;
        const BBLK* next = next_block();
        const NODE* following = next && next->statements ? next->statements->first : nullptr;
        if ((t->op == RETURN || t->op == URETURN) && following && following->op == t->op && trees_are_congruent_se_ok(t, following))
            return false;
        if (t->op == BRANCH && next && target(t->left) == next) {
            --t->left->lbl->refcount;
            return false;
        }
        wrexpr(s);
        // Nothing looks back at a statement that is written, and it is in the cache now.
        erase_tree(s->first);
        s->first = nullptr;
        return true;
    }

    BBLK* bb;
};

// Tells of the first block, and of each behind one of another loop, which loop it lies in.
class LOOP_PLACES {
public:
    explicit LOOP_PLACES(const CODE_RECORDS& function) : records(function) {}

    void enter(const BBLK* bb) {
        const uint32_t at = records.loop_at(bb->serial);
        if (at == last || at == CODE_RECORDS::NOWHERE) return;
        last = at;
        const CODE_LOOP& loop = records.loops[at];
        const bool is_written = loop.counter && loop.counter->index >= 0; // else it went with its last use
        o_file->if_write_inloop(loop.id, is_written ? loop.counter : nullptr, loop.counter_flags);
    }

private:
    const CODE_RECORDS& records;
    uint32_t last = CODE_RECORDS::NOWHERE;
};

void write_entry_count(FUNINFO* f) {
    if (f->profile_status != 2 || f->entry_count == NO_PROFILE || find_pragma(currfunc, PRG_FUNC_NUM_CALLED)) return;
    int32_t largest = 0;
    for (const BBLK* bb = f->bb_list; bb; bb = bb->dflink)
        for (const LBL* lbl = bb->label; lbl; lbl = lbl->next)
            if (lbl->refcount) largest = std::max(largest, lbl->index);
    LBL entry;
    entry.index = largest + 1;
    entry.refcount = 1;
    LIST* cell = mkelist(maketree(BRANCH, mk_LABELREF(&entry, f->entry_count), nullptr, tp->int_t), nullptr, nullptr);
    const int interlist = source_interlist;
    source_interlist = 0;
    wrexpr(cell);
    source_interlist = interlist;
    erase_tree_list(cell);
    wrbdlr(&entry);
}

} // namespace

void wrbdlr(const LBL* labels) {
    for (const LBL* lbl = labels; lbl; lbl = lbl->next) {
        if (!lbl->refcount) continue;
        o_file->if_write_label(static_cast<uint32_t>(lbl->index));
        debug_printf("*%d\n", lbl->index);
        if (source_interlist) wrasmr(IFR_COMMENT, ("L" + std::to_string(lbl->index) + ":").c_str(), nullptr);
    }
}

void wrbblocks() {
    FUNINFO* f = currfuninfo;
    renumber_bblocks();
    if (f->has_intrinsics)
        for (BBLK* bb = f->bb_list; bb; bb = bb->dflink)
            for (LIST* s = bb->statements; s; s = s->rest) s->first = rewrite_tree(s->first, lower_lane_move);
    if (print_debug && write_opt_info) prbbinfix(finfo);
    empty_unreached_spins(f);
    write_entry_count(f);
    LOOP_PLACES places(f->code_records);
    for (BBLK* bb = f->bb_list; bb; bb = bb->dflink) {
        if (bb->statements) places.enter(bb);
        wrbdlr(bb->label);
        BLOCK_WRITER(bb).run();
    }
}

namespace {

// A comment line that shows the statement as source text ahead of its record.
bool interlists(const NODE* t) {
    if (t->op == PCOMMA || tree_is_arg_prolog(t) || tree_is_ASM_comment(t)) return false;
    if (t->op != PPRAGMA) return true;
    const int kind = t->pragma->kind;
    return !((kind >= 41 && kind <= 44) || (kind >= 126 && kind <= 128));
}

} // namespace

void wrexpr(LIST* element) {
    NODE* t = element->first;
    if (source_interlist && interlists(t)) wrasmr(IFR_COMMENT, (";" + stmt2infix(t)).c_str(), nullptr);
    if (t->op == PPRAGMA) {
        if (t->pragma->kind != PRG_LOOP_FLAGS) o_file->if_write_pragma(t->pragma);
        return;
    }
    if (t->op == ASM) {
        wrasmr(t->u.lval.fits_in<int>(), t->text, element->psn);
        return;
    }
    element->first = t = insert_mandatory_casts(t);
    o_file->if_write_expr(nullptr, element->psn);
    element->first = wrtree(t);
}
