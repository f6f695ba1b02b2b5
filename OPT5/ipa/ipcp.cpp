// Parameters that have one value at all calls.
//
// Needs: FUNINFO::formals (known_calls.cpp), the bodies of all functions. Leaves: FPARM::kind and FPARM::known; no body is
// changed before the functions are worked on again.
// Sound because a parameter of a function with formals holds what one of the calls that are looked at passes. What a call
// passes is kept as a jump function: a tree of constants and of the caller's own parameters, as they were on entry. Every
// formal starts without a value, takes in the arguments of all calls, and is given up where two differ; a jump function of
// a formal that has no value yet waits for it. So when nothing changes any more, in cycles of calls too, the value of a
// formal is what every call passes: `f(n)` in f passes n on, and `f(n - 1)` ends what was known. A call whose arguments are
// not those of the parameters, in number or size, ends what is known of the function.
#include "OPT5/ipa/ipcp.h"

#include "OPT5/ipa/copy_cfg.h"
#include "OPT5/ipa/known_calls.h"
#include "OPT5/ipa/progana.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/mvp/mvp.h"
#include "OPT5/simp/simp.h"
#include "OPT5/vp/vp.h"

#include <algorithm>
#include <deque>
#include <unordered_map>
#include <unordered_set>

// ---- While reading

// `cannot_beta` is final when the call graph stands: who has formals then is what counts.
void init_ipcp_for_fun() {
    constexpr uint64_t BARRED = FUN_is_SYSTEM | FUN_is_cg_root | FUN_cannot_beta | FUN_is_anonymous | FUN_is_suppressed;
    const std::vector<SYMTAB*> parameters = parameters_in_order(*currfuninfo);
    const TYPE* type = currfuninfo->symbol->type->getr(TYPE::tpk_func);
    const bool any_scalar =
        std::any_of(parameters.begin(), parameters.end(), [](const SYMTAB* s) { return s->type->is_scalar(); });
    const bool is_shared = currfuninfo->symbol->retention == 2 || currfuninfo->symbol->retention == 3;
    if (opt_level() <= 2 || TEST_FLAG(currfuninfo, BARRED) || !any_scalar || type->vararg() || is_shared ||
        symbol_has_pragma(currfuninfo->symbol, PRG_WEAK) || func_is_nonconforming(currfuninfo->symbol))
        set_flags(currfuninfo, FUN_cannot_beta);
}

// ---- Jump functions

bool arg_is_valid_jump_function(const NODE* t) {
    for (; t; t = t->left) {
        if (t->type->is_csu() || op_has_effect(t->op)) return false;
        switch (t->op) {
        case NAME: return t->u.sym && t->u.sym->level == 1 && !t->type->is_volatile() && !t->u.sym->type->is_volatile();
        case UAND: {
            const NODE* object = without_members(static_cast<const NODE*>(t->left));
            return object->op == NAME && expr_is_globally_evaluable(object);
        }
        case UMULT: // may have been written since
        case STREF:
        case STDOT:
        case ARGREF:
        case SCON: // a copy elsewhere is another object
        case ICALL:
        case UICALL:
        case LABELREF: return false;
        default:
            if (t->op >= DFG_DEF || !arg_is_valid_jump_function(t->right)) return false;
        }
    }
    return true;
}

namespace {

bool names_a_parameter(const NODE* t) {
    return any_subtree(t, [](const NODE* n) { return n->op == NAME && n->u.sym && n->u.sym->level == 1; });
}

bool is_value(const NODE* t) {
    if (names_a_parameter(t)) return false;
    while (t->op == PCONV) t = t->left;
    return t->op == ICON || t->op == FCON || (t->type->is_pointer() && arg_is_valid_jump_function(t));
}

bool kinds_agree(const TYPE* a, const TYPE* b) {
    if (a->size != b->size) return false;
    if (a->is_pointer() || b->is_pointer()) return a->is_pointer() && b->is_pointer();
    return a->is_float() == b->is_float();
}

// In the type of what holds it, or null.
NODE* converted(TYPE* type, NODE* value) {
    value = simp_tree(coerce_to_type(type, value), nullptr);
    if (is_value(value) && kinds_agree(value->type, type)) return value;
    erase_tree(value);
    return nullptr;
}

// What a body makes of its parameters: those that nothing but plain reads name, and the locals that hold one all the time.
class PARAMETER_READS {
public:
    explicit PARAMETER_READS(const FUNINFO* f);
    int index_of(const SYMTAB* parm) const { // -1: not a parameter whose value on entry can be told
        auto at = index.find(parm);
        return at == index.end() || changed.count(parm) ? -1 : at->second;
    }
    // The argument in terms of the parameters, with locals that hold one replaced.
    NODE* jump_function(const NODE* argument) const;
    bool takes_an_address() const { return address_taken; }
    // How often the body names the parameter, or its local, besides in the prolog.
    int reads_of(const SYMTAB* parm) const;

private:
    void look(const NODE* tree);

    std::unordered_map<const SYMTAB*, int> index;          // looked up
    std::unordered_map<const SYMTAB*, const NODE*> copies; // what the prolog gives a local; looked up
    std::unordered_set<const SYMTAB*> changed;             // or not known; membership only
    std::unordered_map<const SYMTAB*, int> reads;          // looked up
    bool address_taken = false;
};

void PARAMETER_READS::look(const NODE* tree) {
    for_each_subtree(tree, [this](const NODE* t) {
        if (t->op == NAME) ++reads[t->u.sym];
        const bool takes_address = t->op == UAND || t->op == ARGREF;
        if (!t->left || (!takes_address && !writes_left_operand(t->op))) return;
        const NODE* name = name_of_place(static_cast<const NODE*>(t->left));
        if (!name) return;
        changed.insert(name->u.sym);
        address_taken |= takes_address && name->u.sym->level == 1;
    });
}

PARAMETER_READS::PARAMETER_READS(const FUNINFO* f) {
    int n = 0;
    for (const SYMTAB* s : parameters_in_order(*f)) index[s] = n++;
    const NODE* prolog = stmt_is_arg_prolog(f->bb_list->statements) ? f->bb_list->statements->first : nullptr;
    for_each_tree(f, [&](const NODE* tree) {
        if (tree != prolog) look(tree);
    });
    for_each_subtree(prolog, [this](const NODE* t) {
        if (t->op != ASG && t->op != STASG) return;
        look(t->right);
        if (t->left->op != NAME) return look(t);
        const SYMTAB* local = t->left->u.sym;
        if (t->op == ASG && !local->type->is_volatile() && copies.emplace(local, t->right).second) return;
        changed.insert(local);
    });
}

int PARAMETER_READS::reads_of(const SYMTAB* parm) const {
    auto of = [this](const SYMTAB* s) {
        auto at = reads.find(s);
        return at == reads.end() ? 0 : at->second;
    };
    int n = of(parm);
    for (const auto& [local, value] : copies) // a sum
        if (any_subtree(value, [parm](const NODE* t) { return t->op == NAME && t->u.sym == parm; })) n += of(local) - 1;
    return n;
}

NODE* PARAMETER_READS::jump_function(const NODE* argument) const {
    NODE* tree = rewrite_tree(copy_tree(argument, false), [this](NODE* t) {
        if (t->op != NAME || !t->u.sym || changed.count(t->u.sym)) return t;
        auto at = copies.find(t->u.sym);
        if (at == copies.end() || !t->type->is_scalar()) return t;
        NODE* value = coerce_to_type(t->u.sym->type->stqs(), copy_tree(at->second, false));
        erase_node(t);
        return value;
    });
    tree = simp_tree(tree, nullptr);
    bool is_known = !tree_has_side_effects(tree) && arg_is_valid_jump_function(tree);
    if (is_known)
        for_each_subtree(tree, [&](const NODE* t) {
            if (t->op == NAME && t->u.sym->level == 1 && index_of(t->u.sym) < 0) is_known = false;
        });
    if (is_known) return tree;
    erase_tree(tree);
    return nullptr;
}

// ---- The solver

struct LEVEL {
    enum KIND : char { UNREADY = 'T', ONE_VALUE = 'C', ANYTHING = 'B' };
};

struct FORMAL {
    SYMTAB* parm = nullptr;
    LEVEL::KIND level = LEVEL::UNREADY;
    NODE* value = nullptr; // of ONE_VALUE; owned until it is given to the FPARM
    bool may_go = false, may_be_address = false;
    vpset values;            // of an integer, as long as it is not empty: what the arguments so far may be
    bool has_values = false; // it has not been given up
    int widened = 0;
    std::vector<size_t> supports; // the arguments that name it, by number
};

struct ARGUMENT {
    FUNINFO *caller, *callee;
    int number;       // of the parameter
    NODE* tree;       // the jump function, or null: anything. Owned
    const NODE *passed, *statement; // as they stand in the caller
    vpset range; // without a jump function, of an integer: at this call, whatever the caller's parameters are
    std::string text; // for the debug stream
};

class SOLVER {
public:
    ~SOLVER() {
        for (ARGUMENT& a : arguments) erase_tree(a.tree);
    }
    void run();

private:
    void enter_functions();
    void link(FUNINFO* caller);
    void link_call(FUNINFO* caller, const NODE* call, const NODE* statement, const PARAMETER_READS& reads);
    void find_ranges(FUNINFO* caller, size_t first);
    void give_up(FUNINFO* callee);
    void iterate();
    bool meet(const ARGUMENT& a);
    bool meet_trees(const ARGUMENT& a);
    bool meet_values(const ARGUMENT& a);
    bool values_of(const ARGUMENT& a, vpset* out) const;
    LEVEL::KIND evaluate(const ARGUMENT& a, NODE** value) const;
    FORMAL* formal_of(FUNINFO* f, const SYMTAB* parm);
    const FORMAL* formal_of(FUNINFO* f, const SYMTAB* parm) const { return const_cast<SOLVER*>(this)->formal_of(f, parm); }
    bool fall(FORMAL& formal) const;
    void decide(FUNINFO* f);
    void print(FUNINFO* f) const;
    void print_argument(const char* format, const ARGUMENT& a) const;
    static void report(FUNINFO* f);

    std::vector<FUNINFO*> functions; // with formals, callers first
    std::unordered_map<const FUNINFO*, std::vector<FORMAL>> formals; // looked up
    std::vector<ARGUMENT> arguments;
};

std::string text_of(const NODE* tree) { return tree ? tree_to_infix(tree) : "NULL"; }

FORMAL* SOLVER::formal_of(FUNINFO* f, const SYMTAB* parm) {
    auto at = formals.find(f);
    if (at == formals.end()) return nullptr;
    for (FORMAL& formal : at->second)
        if (formal.parm == parm) return &formal;
    return nullptr;
}

bool SOLVER::fall(FORMAL& formal) const {
    if (formal.level == LEVEL::ANYTHING) return false;
    formal.level = LEVEL::ANYTHING;
    erase_tree(formal.value);
    formal.value = nullptr;
    return true;
}

bool has_back_edge(const FUNINFO* f) {
    need(fact::block_numbers);
    for (const BBLK* bb = f->bb_list; bb; bb = bb->dflink)
        for (const EDGE* e = bb->successors; e; e = e->rest)
            if (e->first->dfn <= bb->dfn) return true;
    return false;
}

void SOLVER::enter_functions() {
    for (FUNINFO* f : callers_first()) {
        if (f->formals.empty() || !f->bb_list) continue; // a body that was expanded at its last call is gone
        functions.push_back(f);
        const CURRENT current(f);
        const PARAMETER_READS reads(f);
        const bool loops = has_back_edge(f);
        const bool may_beta = !TEST_FLAG(f, FUN_cannot_beta) && !reads.takes_an_address();
        std::vector<FORMAL>& list = formals[f];
        for (SYMTAB* s : parameters_in_order(*f)) {
            FORMAL formal;
            formal.parm = s;
            formal.may_go = may_beta && s->sclass == SC_PARM && s->type->is_scalar() && !s->type->is_volatile() &&
                            !(s->cqual & CQ_GLOBAL_REGISTER) && !s->pragma && reads.index_of(s) >= 0;
            formal.has_values = may_beta && has_value_range(s->type) && !s->type->is_volatile() && reads.index_of(s) >= 0;
            formal.may_be_address = !loops && reads.reads_of(s) <= 1;
            if (!s->type->is_scalar() || s->type->is_volatile()) formal.level = LEVEL::ANYTHING;
            list.push_back(std::move(formal));
        }
    }
}

// Of a call that does not fit its function nothing can be told, and it must not lose an argument either.
void SOLVER::give_up(FUNINFO* callee) {
    set_flags(callee, FUN_cannot_beta);
    for (FORMAL& formal : formals[callee]) {
        fall(formal);
        formal.may_go = formal.has_values = false;
    }
}

void SOLVER::print_argument(const char* format, const ARGUMENT& a) const {
    debug_printf(format, a.caller->name.c_str(), a.callee->name.c_str(), a.number,
                 formals.at(a.callee)[static_cast<size_t>(a.number)].parm->name, a.text.c_str());
}

void SOLVER::link_call(FUNINFO* caller, const NODE* call, const NODE* statement, const PARAMETER_READS& reads) {
    FUNINFO* callee = find_FUNINFO_for_call(call);
    auto at = callee ? formals.find(callee) : formals.end();
    if (at == formals.end()) return;
    NODE* list = call->op == CALL ? call->right : nullptr;
    const auto count = static_cast<size_t>(arg_list_count(list));
    if (count != at->second.size() || (call->op == CALL && !call->u.lval.is_zero())) return give_up(callee);
    for (size_t i = 0; i < count; ++i) {
        const NODE* passed = arg_list_lookup(list, static_cast<int>(i));
        FORMAL& formal = at->second[i];
        const bool by_value = formal.parm->type->is_scalar() && passed->op != ARGREF;
        if (by_value && passed->type->size != formal.parm->type->size) give_up(callee);
        ARGUMENT a{caller, callee, static_cast<int>(i), nullptr, passed, statement, {}, {}};
        if (by_value && kinds_agree(passed->type, formal.parm->type)) a.tree = reads.jump_function(passed);
        if (print_debug) {
            a.text = text_of(passed);
            print_argument("\n--> Linking call from %s to %s, arg %d (%s):  aarg %s", a);
            if (a.tree)
                debug_printf(", parm -> %s (tree %s (level %c))\n", formal.parm->name, text_of(a.tree).c_str(), formal.level);
            else
                debug_printf(", parm %s\n[Bottoming tree for %s]\n", formal.parm->name, formal.parm->name);
        }
        if (!a.tree) fall(formal);
        if (!a.tree && (!by_value || !has_vpset(passed->type))) a.passed = nullptr;
        if (a.tree)
            for_each_subtree(static_cast<const NODE*>(a.tree), [&](const NODE* t) {
                if (t->op != NAME || t->u.sym->level != 1) return;
                if (FORMAL* source = formal_of(caller, t->u.sym)) source->supports.push_back(arguments.size());
            });
        arguments.push_back(std::move(a));
    }
}

// What the caller's other arguments, from `first` on, may be at their calls.
void SOLVER::find_ranges(FUNINFO* caller, size_t first) {
    std::unordered_map<const NODE*, std::vector<size_t>> of_statement; // looked up
    bool names_a_local = false;
    for (size_t i = first; i < arguments.size(); ++i) {
        const ARGUMENT& a = arguments[i];
        if (a.tree || !a.passed) continue;
        of_statement[a.statement].push_back(i);
        names_a_local |= any_subtree(a.passed, [](const NODE* t) { return t->op == NAME && t->u.sym && t->u.sym->level == 2; });
    }
    if (of_statement.empty()) return;
    auto evaluate_at = [&](const NODE* statement, vpenv env) {
        if (auto at = of_statement.find(statement); at != of_statement.end())
            for (size_t i : at->second) arguments[i].range = vpset_of_tree(arguments[i].passed, env);
    };
    if (names_a_local) construct_vpsets_for_cfg(1, VP_QUESTION::ARGUMENTS);
    if (!vpenv_store) init_vpenv_allocation({}, 0);
    for (size_t i = first; i < arguments.size(); ++i)
        if (!arguments[i].tree && arguments[i].passed) arguments[i].range = vpset_of_tree(arguments[i].passed, vpenv());
    for (const BBLK* bb = caller->bb_list; bb && names_a_local; bb = bb->dflink) {
        const vpenv* entry = bb_vpenv(bb, false);
        vpenv env = entry ? *entry : vpenv();
        for (const LIST* s = bb->statements; s && entry; s = s->rest) {
            const VP_EFFECT effect(s->first);
            evaluate_at(s->first, effect.during(env));
            env = effect.behind(env, false);
        }
    }
    deconstruct_vpsets_for_cfg();
}

void SOLVER::link(FUNINFO* caller) {
    if (!caller->bb_list) return;
    const CURRENT current(caller);
    const PARAMETER_READS reads(caller);
    const size_t first = arguments.size();
    for_each_tree(caller, [&](const NODE* tree) {
        for_each_subtree(tree, [&](const NODE* t) {
            if (op_is_call(t->op)) link_call(caller, t, tree, reads);
        });
    });
    find_ranges(caller, first);
}

// With the values that the caller's parameters have by now.
LEVEL::KIND SOLVER::evaluate(const ARGUMENT& a, NODE** value) const {
    if (!a.tree) return LEVEL::ANYTHING;
    LEVEL::KIND level = LEVEL::ONE_VALUE;
    NODE* tree = rewrite_tree(copy_tree(a.tree), [&](NODE* t) {
        if (t->op != NAME || t->u.sym->level != 1) return t;
        const FORMAL* source = formal_of(a.caller, t->u.sym);
        if (!source || source->level == LEVEL::ANYTHING) {
            level = LEVEL::ANYTHING;
            return t;
        }
        if (source->level == LEVEL::UNREADY) {
            if (level == LEVEL::ONE_VALUE) level = LEVEL::UNREADY;
            return t;
        }
        erase_node(t);
        return copy_tree(source->value);
    });
    if (level != LEVEL::ONE_VALUE) {
        erase_tree(tree);
        return level;
    }
    *value = converted(formals.at(a.callee)[static_cast<size_t>(a.number)].parm->type->stqs(), simp_tree(tree, nullptr));
    return *value ? LEVEL::ONE_VALUE : LEVEL::ANYTHING;
}

// Whether the formal's one value changed.
bool SOLVER::meet_trees(const ARGUMENT& a) {
    FORMAL& formal = formals.at(a.callee)[static_cast<size_t>(a.number)];
    if (formal.level == LEVEL::ANYTHING) return false;
    NODE* value = nullptr;
    const LEVEL::KIND level = evaluate(a, &value);
    if (print_debug) {
        print_argument("\n--> Iterating call from %s to %s, arg %d (%s):  aarg %s", a);
        debug_printf("\n  --> Meeting %s (fparm, level %c)", formal.parm->name, formal.level);
        debug_printf(" with %s (aarg, level %c) in call from %s to %s, arg %d\n", a.text.c_str(), level, a.caller->name.c_str(),
                     a.callee->name.c_str(), a.number);
    }
    if (level == LEVEL::UNREADY) {
        if (print_debug) debug_printf("--> Aarg unready, bailing early.\n");
        return false;
    }
    if (level == LEVEL::ANYTHING) return fall(formal);
    if (formal.level == LEVEL::UNREADY) {
        formal.level = LEVEL::ONE_VALUE;
        formal.value = value;
        return true;
    }
    const bool same = trees_are_congruent(formal.value, value, false);
    erase_tree(value);
    return !same && fall(formal);
}

// Where the caller's parameters are not known yet, the argument waits for them.
bool SOLVER::values_of(const ARGUMENT& a, vpset* out) const {
    if (!a.tree) {
        *out = a.range;
        return true;
    }
    std::vector<SYMTAB*> parameters;
    auto at = formals.find(a.caller);
    if (at != formals.end())
        for (const FORMAL& f : at->second)
            if (f.has_values) parameters.push_back(f.parm);
    bool is_ready = true;
    init_vpenv_allocation(parameters, parameters.size());
    vpenv env;
    for_each_subtree(static_cast<const NODE*>(a.tree), [&](const NODE* t) {
        const FORMAL* f = t->op == NAME && t->u.sym->level == 1 ? formal_of(a.caller, t->u.sym) : nullptr;
        if (!f || !f->has_values) return;
        is_ready &= !vpset_is_empty(f->values);
        env = assign_vpset_in_vpenv(f->parm, f->values, env);
    });
    if (is_ready) {
        eval_expr_in_vpenv(out, a.tree, nullptr, env, 0);
        if (print_debug && env != vpenv()) dump_vpenv(env, "VPENV for aarg:\n");
    }
    erase_vpenv();
    return is_ready;
}

// Whether the formal's values changed. What keeps growing is widened to one slice, to all that its step reaches, and to
// anything.
bool SOLVER::meet_values(const ARGUMENT& a) {
    constexpr int TO_ONE_SLICE = 3, TO_ALL_STEPS = 5, TO_ANYTHING = 8;
    FORMAL& formal = formals.at(a.callee)[static_cast<size_t>(a.number)];
    vpset passed;
    if (!formal.has_values || !values_of(a, &passed)) return false;
    const TYPE* type = formal.parm->type;
    truncate_vpset_to_type(&passed, type);
    vpset all = passed;
    if (!vpset_is_empty(passed) && !vpset_is_empty(formal.values)) vpset_union(&all, formal.values, passed);
    if (!vpset_is_empty(passed) && vpset_equal(all, formal.values)) return false;
    if (++formal.widened > TO_ONE_SLICE && !vpset_is_empty(all)) {
        VPSLICE hull;
        vpset_compress(&hull, all);
        all = vpset(hull);
        if (formal.widened > TO_ALL_STEPS && hull.step) include_incr_in_vpset(hull.step, &all, type);
    }
    formal.has_values = !vpset_is_empty(passed) && formal.widened <= TO_ANYTHING && !vpset_is_bottom(all, type);
    formal.values = formal.has_values ? all : vpset();
    return true;
}

bool SOLVER::meet(const ARGUMENT& a) {
    const CURRENT current(a.caller);
    const bool changed = meet_trees(a);
    return meet_values(a) || changed;
}

void SOLVER::iterate() {
    std::deque<size_t> work;
    std::vector<bool> waits(arguments.size(), true);
    for (size_t i = 0; i < arguments.size(); ++i) work.push_back(i);
    while (!work.empty()) {
        const size_t i = work.front();
        work.pop_front();
        waits[i] = false;
        if (!meet(arguments[i])) continue;
        for (size_t next : formals.at(arguments[i].callee)[static_cast<size_t>(arguments[i].number)].supports)
            if (!waits[next]) {
                waits[next] = true;
                work.push_back(next);
            }
    }
}

// ---- The decision

// A variable is cheaper to read than an address is to make: where it is read more often than once a call, the object stays
// an argument. A function that is called by name tells more than one whose address is passed.
bool is_worth_it(const FORMAL& formal) {
    bool of_object = false;
    for_each_subtree(static_cast<const NODE*>(formal.value),
                     [&](const NODE* t) { of_object |= t->op == NAME && !t->u.sym->is_function(); });
    return !of_object || formal.may_be_address;
}

// Of the variable that the body reads: a local that the prolog gives the parameter's value, or the parameter itself.
void assert_formal(FUNINFO* f, const FORMAL& formal) {
    if (!formal.value && (!formal.has_values || vpset_is_empty(formal.values))) return;
    const LIST* first = f->bb_list->statements;
    if (!stmt_is_arg_prolog(first)) return;
    SYMTAB* read = nullptr;
    for_each_subtree(static_cast<const NODE*>(first->first), [&](const NODE* t) {
        if (t->op == ASG && t->left->op == NAME && t->right->op == NAME && t->right->u.sym == formal.parm) read = t->left->u.sym;
    });
    if (read && read->type->size == formal.parm->type->size) assert_values_on_entry(f, read, formal.values, formal.value);
}

void SOLVER::decide(FUNINFO* f) {
    std::vector<FORMAL>& list = formals.at(f);
    if (print_debug) print(f);
    bool any = false;
    for (size_t i = 0; i < list.size(); ++i) {
        FORMAL& formal = list[i];
        if (formal.has_values && !vpset_is_empty(formal.values)) enter_vpset_of_formal_parm(f, formal.parm->name, formal.values);
        if (formal.level != LEVEL::ONE_VALUE && formal.has_values && vpset_is_single(formal.values) && !formal.parm->type->is_enum()) {
            formal.level = LEVEL::ONE_VALUE;
            formal.value = mk_ICON(to_int65(vpset_minimum(formal.values)), formal.parm->type->stqs());
        }
        if (values_are_asserted()) assert_formal(f, formal);
        if (formal.level != LEVEL::ONE_VALUE) continue;
        if (!formal.may_go || !is_worth_it(formal) || values_are_asserted()) {
            erase_tree(formal.value);
            formal.value = nullptr;
            continue;
        }
        f->formals[i].kind = 1;
        f->formals[i].known = formal.value;
        if (print_debug) {
            if (!any) debug_printf("\nFunction %s() will be specialized on these parameters:\n", f->name.c_str());
            debug_printf("\t[%ld] %s == %s\n", static_cast<long>(i), formal.parm->name, text_of(formal.value).c_str());
        }
        any = true;
    }
    if (any && write_opt_info) report(f);
}

void SOLVER::print(FUNINFO* f) const {
    const std::vector<FORMAL>& list = formals.at(f);
    debug_printf("\n\tParameters for function %s() [IPCP?=%d]\n", f->name.c_str(), !TEST_FLAG(f, FUN_cannot_beta));
    for (size_t i = 0; i < list.size(); ++i) {
        const FORMAL& formal = list[i];
        debug_printf("\t  #%ld %s (level %c)\tVP info: %s\n", static_cast<long>(i), formal.parm->name, formal.level,
                     vpset2string(formal.values).c_str());
        if (formal.value) debug_printf("\n\t\t\ttree: %s\n", text_of(formal.value).c_str());
        for (size_t n : formal.supports) {
            const ARGUMENT& a = arguments[n];
            debug_printf("\t\t\tSupports arg #%d of call to %s(): %s (level %c)\n", a.number, a.callee->name.c_str(),
                         a.text.c_str(), formals.at(a.callee)[static_cast<size_t>(a.number)].level);
        }
    }
}

void SOLVER::report(FUNINFO* f) {
    info_printf("\n   %s has these parameter attributes:\n", f->name.c_str());
    for (const FPARM& p : f->formals)
        if (p.kind == 1) info_printf("      %s : == %s\n", p.name.c_str(), text_of(p.known).c_str());
}

void SOLVER::run() {
    enter_functions();
    for (FUNINFO* f : callers_first()) link(f);
    iterate();
    if (write_opt_info) info_printf("\nResults of interprocedural value propagation:\n");
    for (FUNINFO* f : functions) decide(f);
}

} // namespace

void analyze_cg_for_ipcp() {
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'analyze_cg_for_ipcp' ---------\n");
    SOLVER().run();
}

void do_interprocedural_propagation() {
    constexpr int LEAST_LEVEL = 3;
    if (!cg_list) set_up_and_build_call_graph();
    if (!cg_list) return;
    if (do_IP_MVP) return do_IP_metavalue_propagation();
    if (opt_level() < LEAST_LEVEL || !enter_formals()) return;
    analyze_cg_for_ipcp();
    summarize_pointer_parameters();
}
