// Sequencing of raw trees into statements.
//
// The parser's statements hold control flow at their root: conditional branches that jump when their condition is
// false, conditional expressions and logical operators used for effect, comma chains, increments. Each becomes plain
// statements, IFs that name both targets, and labels, in the order in which the tree would have been evaluated. Control
// flow that yields a value inside an expression stays where it is. A condition made of ANDAND, OROR and EXCLAIM becomes
// one IF a test.

#include "OPT5/simp/seq.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/bif.h"
#include "UTIL/abort.h"

#include <cstring>
#include <vector>

namespace {

constexpr int ASM_COMMENT = 47;

void dispatch_behind(NODE* t, LIST** out, PSN* psn) {
    LBL* next = mklabel(0, nullptr, nullptr);
    *out = mkelist(make_magic_EH_SWITCH(t, mk_LABELREF(next)), *out, psn);
    *out = mkelist(mk_LABELDEF(next), *out, nullptr);
}

class SEQUENCER {
public:
    // `simplified`: the tree that `statement` is first given has been through the simplifier as it stands.
    // `dispatches`: what may lead to a handler is followed by its dispatch.
    SEQUENCER(LIST** statement_list, PSN* position, bool simplified, bool dispatches = false)
        : out(statement_list), psn(position), is_simplified(simplified), has_dispatches(dispatches) {}

    void statement(NODE* t) {
        const bool takes_apart = t->op == QUEST || t->op == ANDAND || t->op == OROR || t->op == COMMAOP ||
                                 t->op == PLUSPLUS || t->op == MINMIN || t->op == CBRANCH;
        if (takes_apart) is_simplified = false;
        switch (t->op) {
        case QUEST: conditional(t); break;
        case ANDAND:
        case OROR: logical(t); break;
        case COMMAOP: comma(t); break;
        case PLUSPLUS:
        case MINMIN: increment(t); break;
        case CBRANCH: conditional_branch(t); break;
        case LABELDEF: emit(t); break;
        case BRANCH:
            if (!joined_to_if(t)) emit(t);
            break;
        default: plain(t); break;
        }
    }

    // What was emitted last, but for dispatches; null for nothing.
    const NODE* last_statement() const { return last; }

private:
    // A branch right behind a conditional branch is what that one reaches when its condition is true.
    bool joined_to_if(NODE* t) {
        LIST* label_cell = *out;
        if (!label_cell || label_cell->first->op != LABELDEF || !label_cell->rest || label_cell->rest->first->op != IF)
            return false;
        LBL* lbl = label_cell->first->lbl;
        NODE* targets = label_cell->rest->first->right;
        if (targets->left->lbl != lbl || lbl->refcount != 1 || lbl->index >= 0) return false;
        drop_promises_of_test_loop(label_cell->rest->rest, t->left);
        erase_tree(targets->left);
        targets->left = t->left;
        erase_node(t);
        *out = label_cell->rest;
        erase_node(label_cell->first);
        delete label_cell;
        delete lbl;
        return true;
    }

    // A loop that was written with its test on top, and jumps back right behind it, has no body: it evaluates its test
    // once more than it has iterations, and a reader would take that for the number that was promised.
    static void drop_promises_of_test_loop(LIST* back, const NODE* target) {
        while (back && back->first->op != LABELDEF && !op_transfers_control(back->first->op)) back = back->rest;
        if (!back || back->first->op != LABELDEF || back->first->lbl->index != target->u.lval.fits_in<int32_t>())
            return;
        auto is_pragma = [](const LIST* c) { return c && c->first->op == PPRAGMA; };
        for (const LIST* c = back->rest; is_pragma(c); c = c->rest) {
            const PRAGMA* p = c->first->pragma;
            if (p->kind == PRG_SRC_LOOP && p->args.size() > 3 && p->args[3] == "do") return;
        }
        for (LIST** link = &back->rest; is_pragma(*link);)
            if ((*link)->first->pragma->kind == PRG_MUST_ITERATE || (*link)->first->pragma->kind == PRG_PROB_ITERATE)
                drop_statement(link);
            else
                link = &(*link)->rest;
    }

    void emit(NODE* t) {
        const bool may_be_left = has_dispatches && statement_may_reach_catch(t);
        if (NODE** value = may_be_left ? value_of_transfer(t) : nullptr; value && !tree_is_EH_SWITCH(t)) {
            SYMTAB* held = sym_temp('R', -1, (*value)->type->stqs(), t->ls);
            emit(mk_ASG(mk_NAME(held, t->ls), *value));
            *value = mk_NAME(held, t->ls);
        }
        *out = mkelist(t, *out, psn);
        last = t;
        if (may_be_left && !op_transfers_control(t->op)) dispatch_behind(t, out, psn);
    }
    void label(LBL* lbl) { emit(mk_LABELDEF(lbl)); }
    void branch(LBL* lbl) { emit(maketree(BRANCH, mk_LABELREF(lbl), nullptr, tp->int_t, scope)); }
    NODE* ref(LBL* lbl) { return mk_LABELREF(lbl); }
    LBL* fresh() { return mklabel(0, nullptr, nullptr); }

    // What transfers control, or stands for itself, is simplified and kept; of anything else the effects are.
    void plain(NODE* t) {
        const bool keeps = op_transfers_control(t->op) || t->op == PPRAGMA || t->op == ASM || tree_is_arg_prolog(t);
        if (!is_simplified) t = simp_tree(t, nullptr);
        is_simplified = false;
        if (t && !keeps && is_small_constant_STASG(t)) {
            statement(convert_STASG_to_asgs(t));
            return;
        }
        if (t && !keeps) {
            if (t->op == COMMAOP || t->op == QUEST || t->op == ANDAND || t->op == OROR) {
                statement(t);
                return;
            }
            t = peel_for_effect(t);
            // Peeling can lay bare what has to be sequenced itself.
            if (t && (t->op == COMMAOP || t->op == QUEST || t->op == ANDAND || t->op == OROR)) {
                statement(t);
                return;
            }
        }
        if (t) emit(t);
    }

    void comma(NODE* t) {
        // A long chain leans left.
        std::vector<NODE*> parts;
        while (t->op == COMMAOP) {
            NODE* left = t->left;
            parts.push_back(t->right);
            erase_node(t);
            t = left;
        }
        statement(t);
        for (auto it = parts.rbegin(); it != parts.rend(); ++it) statement(*it);
    }

    void conditional(NODE* t) {
        scope = t->ls;
        NODE* colon = t->right;
        OPT_ASSERT(colon && colon->op == COLON);
        LBL *then = fresh(), *otherwise = fresh(), *end = fresh();
        condition(t->left, then, otherwise);
        label(then);
        statement(colon->left);
        branch(end);
        label(otherwise);
        statement(colon->right);
        branch(end);
        label(end);
        erase_node(colon);
        erase_node(t);
    }

    // Used for effect: the right operand's effects take place or not.
    void logical(NODE* t) {
        scope = t->ls;
        LBL *right = fresh(), *end = fresh();
        if (t->op == ANDAND)
            condition(t->left, right, end);
        else
            condition(t->left, end, right);
        label(right);
        statement(t->right);
        branch(end);
        label(end);
        erase_node(t);
    }

    void increment(NODE* t) {
        t->op = t->op == PLUSPLUS ? PLUSASG : MINUSASG;
        plain(t);
    }

    void conditional_branch(NODE* t) {
        scope = t->ls;
        LBL* next = fresh();
        NODE* target = t->right; // jumped to when the condition is false
        condition(t->left, ref(next), target);
        label(next);
        erase_node(t);
    }

    void condition(NODE* c, LBL* if_true, LBL* if_false) { condition(c, ref(if_true), ref(if_false)); }

    static bool is_opposite(const NODE* c) {
        return c->op == EQ && c->right->op == ICON && c->right->u.lval.is_zero() && c->left->type->is_scalar() &&
               !c->left->type->is_float() && !c->left->type->is_complex() && !c->left->type->is_pointer();
    }

    // Tests `c` and branches to one of two labels; consumes all three.
    void condition(NODE* c, NODE* if_true, NODE* if_false) {
        switch (c->op) {
        case EXCLAIM: {
            NODE* inner = c->left;
            erase_node(c);
            condition(inner, if_false, if_true);
            return;
        }
        case COMMAOP: {
            NODE *first = c->left, *second = c->right;
            erase_node(c);
            statement(first);
            condition(second, if_true, if_false);
            return;
        }
        case ANDAND:
        case OROR: {
            LBL* second = fresh();
            NODE *left = c->left, *right = c->right;
            if (c->op == ANDAND)
                condition(left, ref(second), copy_tree(if_false));
            else
                condition(left, copy_tree(if_true), ref(second));
            erase_node(c);
            label(second);
            condition(right, if_true, if_false);
            return;
        }
        default: break;
        }
        c = simp_for_control(simp_tree(c, nullptr), nullptr);
        if (is_opposite(c)) { // x == 0: x with the targets exchanged
            NODE* inner = c->left;
            erase_node(c->right);
            erase_node(c);
            condition(inner, if_false, if_true);
            return;
        }
        if (c->op == ANDAND || c->op == OROR || c->op == COMMAOP || c->op == EXCLAIM) {
            condition(c, if_true, if_false);
            return;
        }
        emit(mk_IF(c, if_true, if_false, scope));
    }

    LIST** out;
    PSN* psn;
    bool is_simplified;
    const bool has_dispatches;
    const NODE* last = nullptr;
    LS* scope = nullptr;
};

constexpr char NEVER_EXECUTED[] = "_never_executed";

void return_behind(LIST** out, PSN* psn) {
    *out = mkelist(maketree(URETURN, mk_NAME(currfunc), nullptr, tp->void_t, LS::level_2_scope()), *out, psn);
}

// A call of a function that never returns ends the flow of control: what the program has behind it is not reached.
void end_flow_behind(LIST** out, PSN* psn) {
    *out = mkelist(mk_ASM(ASM_COMMENT, "***\t; the preceding call never returns"), *out, psn);
    *out = mkelist(mk_MCALL(NEVER_EXECUTED, nullptr, tp->void_t), *out, psn);
    return_behind(out, psn);
}

bool is_call_that_never_returns(const NODE* t) {
    if (!op_is_call(t->op)) return false;
    FUNINFO* callee = find_FUNINFO_for_call(t);
    return callee && TEST_FLAG(callee, FUN_never_returns);
}

} // namespace

void sequence_tree(NODE* tree, LIST** list, PSN* psn, bool simplified) {
    SEQUENCER(list, psn, simplified).statement(tree);
}

NODE* promote_tree(NODE* tree, LIST** list, PSN* psn) {
    while (tree->op == COMMAOP) {
        NODE *before = tree->left, *value = tree->right;
        erase_node(tree);
        sequence_tree(before, list, psn);
        tree = value;
    }
    return tree;
}

void seq_trees(NODE* (*prepare)(NODE*)) {
    FUNINFO* f = currfuninfo;
    LIST* raw = reverse_list(f->statements);
    const bool catches = f->has_eh();
    LIST* out = nullptr;
    while (raw) {
        LIST* cell = raw;
        raw = raw->rest;
        NODE* t = cell->first;
        PSN* psn = cell->psn;
        delete cell;
        if (prepare) {
            t = prepare(t);
            replace_library_calls(&t);
        }
        SEQUENCER sequencer(&out, psn, !prepare, catches);
        sequencer.statement(t);
        if (const NODE* last = sequencer.last_statement(); last && is_call_that_never_returns(last))
            end_flow_behind(&out, psn);
        else if (last && prepare && last->op == UMCALL && !std::strcmp(last->u.name, NEVER_EXECUTED))
            return_behind(&out, psn); // the mark of an earlier optimization
    }
    f->statements = out;
    f->has_vector_types = false;
}

// ---- Exception dispatch

static bool entry_reaches_catch(uint32_t entry) {
    const auto& eht = currfuninfo->eht;
    for (size_t steps = 0; entry && entry < eht.size() && steps <= eht.size(); ++steps) {
        if (eht[entry].kind == EHK_CATCH && !eht[entry].catches.empty()) return true;
        entry = eht[entry].next_entry;
    }
    return false;
}

bool statement_may_reach_catch(const NODE* t) {
    return any_subtree(t, [](const NODE* n) { return op_is_call(n->op) && entry_reaches_catch(n->eh_entry()); });
}

NODE** value_of_transfer(NODE* t) {
    switch (t->op) {
    case IF:
    case SWITCH: return &t->left;
    case RETURN: return &t->right;
    default: return nullptr;
    }
}

namespace {
// A label of the input: the graph builder finds its block by the number.
NODE* ref_to_numbered(uint32_t label) {
    NODE* t = new_node(LABELREF, tp->int_t);
    t->mk_label(label);
    return t;
}
} // namespace

NODE* make_magic_EH_SWITCH(NODE* call, NODE* fall_through, const EH_HANDLERS* handlers) {
    LS* scope = call->ls;
    NODE* cases = nullptr;
    uint32_t count = 0;
    for (const EHT_ITEM& item : currfuninfo->eht)
        for (const EHT_CATCH& clause : item.catches) {
            if (handlers && !handlers->count(clause.id)) continue;
            NODE* to =
                handlers ? mk_LABELREF(handlers->at(clause.id)) : ref_to_numbered(static_cast<uint32_t>(clause.label));
            NODE* entry = maketree(CASE, mk_ICON(INT65(clause.id), tp->int_t), to, tp->int_t, scope);
            ++count;
            cases = cases ? maketree(COMMA, cases, entry, tp->int_t, scope) : entry;
        }
    OPT_ASSERT(cases != nullptr);
    NODE* dflt = maketree(DEFAULT, fall_through, nullptr, tp->int_t, scope);
    NODE* sw = maketree(SWITCH, mk_MCALL(MAGIC_EH_NAME, nullptr, tp->int_t),
                        maketree(COMMA, cases, dflt, tp->int_t, scope), tp->int_t, scope);
    sw->u.lval = INT65(count);
    return sw;
}

void update_eht_labels(NODE* tree, bool negated) {
    std::vector<NODE*> cases;
    for (NODE* t = tree->right; t; t = t->op == COMMA ? t->left : nullptr) {
        NODE* e = t->op == COMMA ? t->right : t;
        if (e->op == CASE) cases.push_back(e);
    }
    for (NODE* c : cases) {
        const auto id = c->left->u.lval.fits_in<int32_t>();
        for (EHT_ITEM& item : currfuninfo->eht)
            for (EHT_CATCH& clause : item.catches)
                if (clause.id == id) clause.label = negated ? -int64_t(c->right->lbl->index) : c->right->lbl->index;
    }
}
