// Call integration: a call that the inliner chose becomes the callee's body.
//
// The block of the call is split ahead of its statement, the copy of the saved body stands between the two, and each
// return becomes an assignment of the result and a branch. A call of the copy that was chosen in its own function is
// expanded in the same walk. A call under a condition inside a statement gets blocks of its own first; what a comma
// evaluates ahead of a call becomes a statement.
//
// Needs: the saved bodies and the sets of call sites that the inliner made. Leaves: nothing; the graph is new.
// Sound because what the call's statement evaluates beside the call has no order with it in the source: assignments
// inside expressions are statements of their own by then. Arguments are evaluated once, ahead of the body, whether or not
// the body reads them. The locals of the body are new in each expansion and no longer constant: in a loop they are set in
// each iteration. Exceptions that leave the body find what they found when they left the call.
#include "OPT5/ipa/inline.h"

#include "BITVEC/bitvec.h"
#include "OPT5/ipa/copy_cfg.h"
#include "OPT5/ipa/exceptions.h"
#include "OPT5/ipa/inliner.h"
#include "OPT5/ipa/positions.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/scalar/fcp.h"
#include "OPT5/scalar/simpcfg.h"
#include "OPT5/simp/seq.h"
#include "OPT5/simp/simp.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <cstring>
#include <unordered_map>
#include <unordered_set>
#include <vector>

namespace {

constexpr long DEFAULT_DEPTH_LIMIT = 10;
// Units of size that calls which came with expansions add to a function: three a function would be 3^10 at that depth.
constexpr long MOST_NESTED = 4000, MOST_FORCED_DEEP = 100000;

long depth_limit() {
    const auto option = option_obj::OO_inline_recursion_limit;
    return file_options && file_options->getopt(option) ? file_options->getnumarg(option) : DEFAULT_DEPTH_LIMIT;
}

bool is_chosen(const CALL_RECORD* record) {
    const BITVEC* sites = record ? record->caller->inline_sites : nullptr;
    return sites && sites->test(record->id);
}

bool is_forced_deep(const CALL_RECORD* record) {
    const BITVEC* sites = record ? record->caller->deep_sites : nullptr;
    return sites && sites->test(record->id);
}

// A call in a statement, and how it is evaluated there.
struct SITE {
    NODE** slot = nullptr;
    NODE** condition = nullptr; // the outermost QUEST, ANDAND, OROR or COMMAOP that evaluates another operand first, or null
};

class INTEGRATION {
public:
    void run() {
        promote_all_embedded_assignments();
        walk(currfuninfo->bb_list, nullptr, false);
        if (!expansions) return;
        drop_markers();
        renew_dispatches();
        refresh_marks();
        sym_split(currfuninfo);
        rebuildcfg();
        changed(fact::none);
        simpcfg(0, 0);
        fast_CP(4, 1);
        if (print_debug) print_what_was_inlined();
    }

private:
    void walk(BBLK* bb, const BBLK* end, bool deep);
    bool find_site(NODE** slot, NODE** condition, bool deep, SITE* site);
    bool is_to_expand(NODE* call, bool deep);
    BBLK* expand(BBLK* bb, LIST* cell, NODE** slot);
    void put_first_ahead(BBLK* bb, LIST* cell, NODE** comma);
    BBLK* separate(BBLK* bb, LIST* cell, NODE** condition);
    BBLK* split_ahead(BBLK* bb, LIST* cell);
    void bind_arguments(NODE* call, const CFG_COPY& copy, const FUNINFO* body, PSN* psn);
    void adopt(CFG_COPY& copy, LS* scope, const PSN* psn);
    void end_returns(const CFG_COPY& copy, BBLK* following, SYMTAB* result);
    void mark_calls(const CFG_COPY& copy, uint16_t depth);
    void drop_markers();
    void refresh_marks();
    void print_what_was_inlined() const;

    std::unordered_set<const NODE*> left_alone; // calls; membership only
    std::vector<FUNINFO*> inlined_funinfo;      // what has been expanded in the current function, in order
    std::vector<LS*> inlined_scopes;            // and the scopes of the copies
    const PSN* current_psn = nullptr;
    long expansions = 0, nested = 0;
};

// ---- Which calls

bool INTEGRATION::is_to_expand(NODE* call, bool deep) {
    if (!call->call || left_alone.count(call)) return false;
    FUNINFO* callee = find_FUNINFO_for_call(call);
    if (!callee || !callee->symbol || !callee->saved_cfg) return false;
    const bool is_wanted = is_chosen(call->call) || (deep && arguments_fit_parameters(call, callee->symbol));
    if (!is_wanted || find_pragma(currfunc, PRG_FUNC_SYNONYM)) {
        unsuppress_inline_function(callee);
        left_alone.insert(call);
        return false;
    }
    if (call->call->inline_depth > 0 && nested >= (deep ? MOST_FORCED_DEEP : MOST_NESTED)) {
        unsuppress_inline_function(callee);
        left_alone.insert(call);
        return false;
    }
    if (inline_recursion_is_limited() && call->call->inline_depth >= depth_limit()) {
        if (print_debug) debug_printf("\n\t>>>>> WARNING: INLINE recursion limit exceeded.\n");
        if (write_opt_info)
            info_printf("\n>>>> WARNING: INLINE recursion limit exceeded on line %ld.\n", current_psn ? current_psn->line : 0L);
        unsuppress_inline_function(callee);
        clear_flags(callee, FUN_is_inlined);
        left_alone.insert(call);
        return false;
    }
    return true;
}

// The first call, operands ahead of the node that holds them, that is to be expanded.
bool INTEGRATION::find_site(NODE** slot, NODE** condition, bool deep, SITE* site) {
    NODE* t = *slot;
    if (!t) return false;
    const bool has_order = t->op == QUEST || t->op == ANDAND || t->op == OROR || t->op == COMMAOP;
    if (find_site(&t->left, condition, deep, site)) return true;
    if (find_site(&t->right, has_order && !condition ? slot : condition, deep, site)) return true;
    if (!op_is_call(t->op) || !is_to_expand(t, deep)) return false;
    *site = {slot, condition};
    return true;
}

// From a block up to `end`, which is not walked; the blocks of expansions are walked as they come in.
void INTEGRATION::walk(BBLK* bb, const BBLK* end, bool deep) {
    for (; bb && bb != end; bb = bb->dflink)
        for (LIST* s = bb->statements; s;) {
            SITE site;
            current_psn = s->psn;
            if (tree_is_arg_prolog(s->first) || !find_site(&s->first, nullptr, deep, &site)) {
                s = s->rest;
                continue;
            }
            if (site.condition && (*site.condition)->op == COMMAOP) {
                put_first_ahead(bb, s, site.condition);
                continue;
            }
            if (site.condition) {
                bb = separate(bb, s, site.condition);
                s = bb->last_statement();
                continue;
            }
            const bool goes_deep = deep || is_forced_deep((*site.slot)->call);
            BBLK* before = bb;
            bb = expand(bb, s, site.slot);
            walk(before->dflink, bb, goes_deep);
            s = bb->statements;
        }
}

// ---- Blocks

// The statement begins the block that is returned.
BBLK* INTEGRATION::split_ahead(BBLK* bb, LIST* cell) {
    LIST* before = bb->statements;
    if (before == cell) { // the empty statement that it is split behind is removed again
        insert_before(&bb->statements, nullptr, cell->psn);
        BBLK* next = split_block(bb, bb->statements, false);
        drop_statement(&bb->statements);
        return next;
    }
    while (before && before->rest != cell) before = before->rest;
    if (!before) optassert("find(sl->first, bb->statements) != NULL", __FILE__, __LINE__);
    return split_block(bb, before, false);
}

// Of `(a, b)` in a statement, `a` is a statement ahead of it, and of what is expanded in `b`.
void INTEGRATION::put_first_ahead(BBLK* bb, LIST* cell, NODE** comma) {
    NODE* t = *comma;
    *comma = t->right;
    LIST** link = &bb->statements;
    while (*link != cell) link = &(*link)->rest;
    if (NODE* effect = peel_for_effect(t->left)) insert_before(link, effect, cell->psn);
    erase_node(t);
}

// `c ? a : b`, `c && a` or `c || b` inside a statement: a temporary that blocks ahead of it set. Returns the block
// that tests c, where the walk continues.
BBLK* INTEGRATION::separate(BBLK* bb, LIST* cell, NODE** condition) {
    NODE* t = *condition;
    TYPE* type = t->type->stqs();
    const bool has_value = !type->is_void();
    SYMTAB* value = has_value ? sym_temp('R', -1, type, t->ls) : nullptr;
    NODE *yes, *no;
    if (t->op == QUEST) {
        yes = t->right->left;
        no = t->right->right;
        erase_node(t->right);
    } else {
        yes = t->op == ANDAND ? make_boolean(t->right, nullptr) : mk_ICON(INT65(1), type);
        no = t->op == ANDAND ? mk_ICON(INT65(0), type) : make_boolean(t->right, nullptr);
    }
    *condition = value ? mk_NAME(value, t->ls) : mk_ICON(INT65(0), tp->int_t);
    BBLK* following = split_ahead(bb, cell);
    auto arm = [&](BBLK* after, NODE* v) {
        BBLK* to = insert_new_bb_with_branch(-1, after, following, cell->psn);
        NODE* effect = value ? mk_ASG(mk_NAME(value, t->ls), coerce_to_type(type, v)) : v;
        insert_before(&to->statements, effect, cell->psn);
        return to;
    };
    BBLK* on_yes = arm(bb, yes);
    BBLK* on_no = arm(on_yes, no);
    disconnect(bb, following);
    LIST* control = bb->last_statement();
    erase_tree(control->first);
    control->first = mk_IF(t->left, mk_LABELREF_to_bb(on_yes), mk_LABELREF_to_bb(on_no), t->ls);
    connect(bb, on_yes);
    connect(bb, on_no);
    erase_node(t);
    ++expansions; // the graph has changed
    return bb;
}

// The copy's locals and scopes become the function's.
void INTEGRATION::adopt(CFG_COPY& copy, LS* scope, const PSN* psn) {
    FUNINFO* f = currfuninfo;
    if (!scope) scope = LS::level_2_scope();
    if (copy.ls_root && scope) {
        scope->splice_scope(copy.ls_root);
        copy.ls_root->offset_scope(psn ? psn->line : 0);
        inlined_scopes.push_back(copy.ls_root);
    }
    for (auto s = copy.symbols.rbegin(); s != copy.symbols.rend(); ++s) {
        SYMTAB* sym = *s;
        if (sym->level == 1) { // what the body names of a parameter is a variable now
            sym->level = 2;
            sym->sclass = SC_AUTO;
            sym->written_as_parameter = false;
        }
        sym->next = f->pending_syms;
        f->pending_syms = sym;
    }
}

void INTEGRATION::mark_calls(const CFG_COPY& copy, uint16_t depth) {
    for (BBLK* bb = copy.first; bb; bb = bb == copy.last ? nullptr : bb->dflink)
        for (LIST* s = bb->statements; s; s = s->rest)
            for_each_subtree(s->first, [depth](NODE* t) {
                if (op_is_call(t->op) && t->call) t->call->inline_depth = static_cast<uint16_t>(depth + 1);
            });
}

// Whether the control statement stands behind a call that never returns.
bool is_never_reached(const BBLK* bb) {
    const LIST* before = bb->statements;
    for (const LIST* s = before; s->rest; s = s->rest) before = s;
    return before->rest && before->first->op == UMCALL && !std::strcmp(before->first->u.name, "_never_executed");
}

// Each end of the body leads on behind the call; `result` takes what is returned, if anything does.
void INTEGRATION::end_returns(const CFG_COPY& copy, BBLK* following, SYMTAB* result) {
    for (BBLK* bb = copy.first;; bb = bb->dflink) {
        LIST* last = bb->last_statement();
        NODE* t = last->first;
        if ((t->op == RETURN || t->op == URETURN) && is_never_reached(bb)) {
            while (bb->successors) disconnect(bb, bb->successors->first);
            erase_tree(t);
            last->first = maketree(URETURN, mk_NAME(currfunc), nullptr, tp->void_t, LS::level_2_scope());
        } else if (t->op == RETURN || t->op == URETURN) {
            NODE* value = t->op == RETURN ? t->right : nullptr;
            if (t->op == RETURN) t->right = nullptr;
            if (value && result)
                value = mk_ASG(mk_NAME(result, value->ls), value->type->is_scalar() ? coerce_to_type(result->type, value) : value);
            else if (value)
                value = peel_for_effect(value);
            if (value) {
                LIST** link = &bb->statements;
                while (*link != last) link = &(*link)->rest;
                insert_before(link, value, last->psn);
            }
            while (bb->successors) disconnect(bb, bb->successors->first);
            erase_tree(t);
            last->first = mk_BRANCH(following);
            connect(bb, following);
        }
        if (bb == copy.last) return;
    }
}

// ---- Arguments

// The NAME of a parameter that an assignment of the prolog copies, through its casts. A list that begins a function may
// hold other trees too.
NODE** parameter_in(NODE* asg) {
    if (asg->op != ASG && asg->op != STASG) return nullptr;
    NODE** slot = &asg->right;
    while ((*slot)->op == SCONV || (*slot)->op == PCONV || (*slot)->op == ISP2CHAR) slot = &(*slot)->left;
    return (*slot)->op == NAME ? slot : nullptr;
}

void list_assignments(NODE* t, std::vector<NODE*>* list) {
    if (t->op == PCOMMA || t->op == COMMA || t->op == COMMAOP) {
        list_assignments(t->left, list);
        list_assignments(t->right, list);
        erase_node(t);
    } else
        list->push_back(t);
}

// What the parameter holds: the argument in its type.
NODE* as_passed(const SYMTAB* parameter, NODE* argument) {
    if (argument->op == STARG || argument->op == ARGREF) {
        NODE* object = argument->left;
        const bool by_address = argument->op == ARGREF && parameter->type->is_pointer();
        erase_node(argument);
        if (by_address) return coerce_to_type(parameter->type->stqs(), apply_UAND_to_struct(object));
        return object->type->is_scalar() ? coerce_to_type(parameter->type->stqs(), object) : object;
    }
    return argument->type->is_scalar() ? coerce_to_type(parameter->type->stqs(), argument) : argument;
}

void take_arguments(NODE* list, std::vector<NODE*>* arguments) {
    if (!list) return;
    if (list->op == COMMA) {
        take_arguments(list->left, arguments);
        take_arguments(list->right, arguments);
        erase_node(list);
    } else
        arguments->push_back(list);
}

// The parameters' copies, in the order that arguments come in.
std::vector<SYMTAB*> parameters_of(const FUNINFO* body, const CFG_COPY& copy) {
    std::vector<SYMTAB*> list = parameters_in_order(*body);
    for (SYMTAB*& s : list) s = copy.symbol_of.at(s);
    return list;
}

// The arguments are evaluated once each, ahead of the body. One that the prolog copies once takes its place there; a
// parameter that more reads is a variable.
void INTEGRATION::bind_arguments(NODE* call, const CFG_COPY& copy, const FUNINFO* body, PSN* psn) {
    std::vector<NODE*> arguments, prolog, ahead;
    take_arguments(call->right, &arguments);
    call->right = nullptr;
    if (call->op == CALL) call->op = UCALL;
    LIST* first = copy.first->statements;
    if (tree_is_arg_prolog(first->first)) {
        list_assignments(first->first, &prolog);
        first->first = nullptr;
        drop_statement(&copy.first->statements);
    }
    std::unordered_map<const SYMTAB*, int> reads; // by the prolog; many where the body reads it
    auto enter_reads = [&reads](const NODE* tree) {
        for_each_subtree(tree, [&reads](const NODE* t) {
            if (t->op == NAME) reads[t->u.sym] += 2;
        });
    };
    for (BBLK* bb = copy.first;; bb = bb->dflink) {
        for (LIST* s = bb->statements; s; s = s->rest) enter_reads(s->first);
        if (bb == copy.last) break;
    }
    for (const EHT_ITEM& item : currfuninfo->eht) enter_reads(item.cleanup);
    std::unordered_map<const SYMTAB*, NODE**> place;
    for (NODE* asg : prolog)
        if (NODE** slot = parameter_in(asg)) {
            ++reads[(*slot)->u.sym];
            place[(*slot)->u.sym] = slot;
        } else {
            enter_reads(asg);
        }
    const std::vector<SYMTAB*> parameters = parameters_of(body, copy);
    for (size_t i = 0; i < arguments.size(); ++i) {
        SYMTAB* parameter = i < parameters.size() ? parameters[i] : nullptr;
        const int n = parameter ? reads[parameter] : 0;
        NODE* value = parameter ? as_passed(parameter, arguments[i]) : arguments[i];
        if (n == 1 && place.count(parameter)) {
            NODE** slot = place[parameter];
            erase_tree(*slot);
            *slot = value;
        } else if (n > 0) {
            ahead.push_back(mk_ASG(mk_NAME(parameter, call->ls), value));
        } else if (NODE* effect = peel_for_effect(value)) {
            ahead.push_back(effect);
        }
    }
    ahead.insert(ahead.end(), prolog.begin(), prolog.end());
    LIST** link = &copy.first->statements;
    for (NODE* t : ahead) link = insert_before(link, simp_tree(t, nullptr), psn);
}

// ---- One call

void merge_marks(const FUNINFO* body) {
    FUNINFO* f = currfuninfo;
    f->has_bitfield_access |= body->has_bitfield_access;
    f->address_taken_local |= body->address_taken_local;
    f->has_cqual10_name |= body->has_cqual10_name;
    f->has_nasserts |= body->has_nasserts;
    f->has_intrinsics |= body->has_intrinsics;
}

// A pragma that asked for the expansion is done with: it would be taken for a wish about the next statement.
void drop_request(BBLK* bb) {
    LIST** link = &bb->statements; // of the pragmas ahead of the control statement
    for (LIST** l = link; (*l)->rest; l = &(*l)->rest)
        if ((*l)->first->op != PPRAGMA) link = &(*l)->rest;
    while ((*link)->rest) {
        const PRAGMA* p = (*link)->first->pragma;
        if (p && (p->kind == PRG_FORCEINLINE || p->kind == PRG_FORCEINLINE_RECURSIVE))
            drop_statement(link);
        else
            link = &(*link)->rest;
    }
}

void check_branch_of_split(const NODE* branch) {
    if (branch->op != BRANCH) optassert("bb->statements->first->op == BRANCH", __FILE__, __LINE__);
    if (branch->left->op != LABELREF) optassert("bb->statements->first->left->op == LABELREF", __FILE__, __LINE__);
}

BBLK* INTEGRATION::expand(BBLK* bb, LIST* sl, NODE** slot) {
    NODE *call = *slot, *statement = sl->first;
    FUNINFO* callee = find_FUNINFO_for_call(call);
    if (!call->call) optassert("call->u2.ocall != NULL", __FILE__, __LINE__);
    OPT_ASSERT(tree_is_subtree_of_tree(call, sl->first));
    if (print_debug)
        debug_printf("\n\t>>>>> (%ld) Integrating procedure %s() <<<<<\n", sl->psn ? sl->psn->line : 0L,
                     callee->name.c_str());
    ++expansions;
    if (call->call->inline_depth > 0) nested += callee->size;

    // What takes the result.
    const bool is_statement = statement == call;
    const bool is_plain = (statement->op == ASG || statement->op == STASG) && slot == &statement->right &&
                          statement->left->op == NAME && !lvalue_is_volatile(statement->left) &&
                          compatible_types(statement->left->type->stqs(), call->type->stqs(), true) &&
                          compatible_types(statement->left->u.sym->type->stqs(), call->type->stqs(), true);
    SYMTAB* result = nullptr;
    if (is_plain)
        result = statement->left->u.sym;
    else if (!is_statement && !call->type->is_void())
        result = sym_temp('R', -1, call->type->stqs(), call->ls);

    const FUNINFO* body = callee->saved_cfg.get();
    CFG_COPY copy = copy_cfg(*body, currfuninfo);
    adopt(copy, call->ls, sl->psn);
    inlined_funinfo.push_back(callee);
    enter_positions(copy, callee->symbol);
    psnref_add(callee->symbol);
    mark_calls(copy, call->call->inline_depth);
    merge_marks(body);
    merge_exception_tables(copy, call->eh_entry());

    BBLK* following_bb = split_ahead(bb, sl);
    drop_request(bb);
    OPT_ASSERT(following_bb != NULL);
    OPT_ASSERT(bb != following_bb);
    check_branch_of_split(bb->branch());
    bb->dflink = bb->uolink = copy.first;
    copy.first->rdflink = bb;
    copy.last->dflink = copy.last->uolink = following_bb;
    following_bb->rdflink = copy.last;
    subst_bb_for_bb_in_bb(copy.first, following_bb, bb);
    disconnect(bb, following_bb);
    connect(bb, copy.first);
    end_returns(copy, following_bb, result);
    bind_arguments(call, copy, body, sl->psn);

    // What is left of the call.
    NODE* left = is_plain || is_statement || call->type->is_void() ? mk_ICON(INT65(0), tp->int_t) : mk_NAME(result, call->ls);
    if (is_plain || is_statement) {
        erase_tree(statement);
        sl->first = left;
    } else {
        *slot = left->type->is_scalar() ? coerce_to_type(call->type->stqs(), left) : left;
        erase_tree(call);
    }
    return following_bb;
}

// ---- The end

// What is left where a call stood alone.
void INTEGRATION::drop_markers() {
    for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
        for (LIST** link = &bb->statements; *link;)
            if ((*link)->first->op == ICON)
                drop_statement(link);
            else
                link = &(*link)->rest;
}

void INTEGRATION::refresh_marks() {
    FUNINFO* f = currfuninfo;
    f->no_calls = true;
    f->has_vector_types = f->has_complex_types = false;
    for_each_tree(f, [f](const NODE* tree) {
        f->no_calls = f->no_calls && !any_subtree(tree, [](const NODE* t) { return op_is_call(t->op); });
        f->has_vector_types = f->has_vector_types || vector_types_exist_in_tree(tree);
        f->has_complex_types = f->has_complex_types || complex_types_exist_in_tree(tree);
    });
}

void INTEGRATION::print_what_was_inlined() const {
    for (const FUNINFO* f : inlined_funinfo) debug_printf("\tinlined: %s()\n", f->name.c_str());
    for (const LS* scope : inlined_scopes)
        debug_printf("\tscope of a copy: #%u, depth %u, lines from %ld\n", scope->id, scope->depth, scope->line_offset);
}

} // namespace

static bool calls_function_with_saved_body() {
    bool found = false;
    for_each_tree(currfuninfo, [&found](const NODE* tree) {
        found = found || any_subtree(tree, [](const NODE* t) {
                    FUNINFO* callee = op_is_call(t->op) ? find_FUNINFO_for_call(t) : nullptr;
                    return callee && callee->saved_cfg;
                });
    });
    return found;
}

void integrate_calls_in_function() {
    if (currfuninfo->bb_list && calls_function_with_saved_body()) INTEGRATION().run();
}
