// Sets of trees in an environment. For this room.
#pragma once

#include "OPT5/vp/vpenv.h"

#include <memory>

struct LOOP;

// What is tracked and evaluated: an integer, enumeration or pointer whose values have a range.
bool has_vpset(const TYPE* type);

// The set of the tree's value, never without a slice for such a type; of another type it has none. With `assign` the
// environment behind the evaluation is returned, as it is behind a statement; otherwise that ahead of it.
vpenv eval_expr_in_vpenv(vpset* out, const NODE* tree, struct LOOP* loop, vpenv env, int assign);
vpset vpset_of_tree(const NODE* tree, vpenv env);
// What holds besides where the condition has come out so; it is evaluated in `env`. False: it cannot come out so.
bool filter_vpenv(vpenv* env, const NODE* condition, bool holds);
// The selector of a SWITCH has one of the values.
bool filter_vpenv_by_values(vpenv* env, const NODE* selector, const vpset& values);

// What a statement does to the environment.
class VP_EFFECT {
public:
    // `loop`: that it stands in, if what the hierarchy knows of it counts.
    explicit VP_EFFECT(const NODE* statement, const struct LOOP* loop = nullptr);
    bool is_none() const { return target < 0 && lost.empty() && !asserted && !loses_globals; }
    // `exclusive`: the environment is changed in place.
    vpenv behind(vpenv env, bool exclusive) const;
    // What the parts of the statement may rely on while it is evaluated: nothing that it writes itself.
    vpenv during(vpenv env) const;
    const std::vector<int>& lost_symbols() const { return lost; }
    int assigned_symbol() const { return target; } // -1 without
    bool may_lose_globals() const { return loses_globals; }
    const NODE* statement() const { return tree; }

private:
    vpset value(vpenv env) const;
    vpenv with_parameters(vpenv env) const;

    const NODE* tree;
    const NODE* asserted = nullptr; // a condition that holds from here on
    int target = -1;                // the symbol that the statement's root assigns
    std::unique_ptr<vpset> course;  // what the target has in the loop; null: anything
    std::vector<int> lost;          // symbols that are written besides
    bool loses_globals = false;
};

// ---- vp_loops.cpp
// What an induction variable of the loop may be at any point of it, or, which is less, where an iteration begins; false
// where that is nothing new.
bool find_vpset_in_LOOPIV(vpset* out, const SYMTAB* sym, const struct LOOP* loop, bool at_head);
// The predicates of the set, which the symbol has in the loop, which does not change it, as assertions of the outermost
// loop of which the same holds. How many they are.
int insert_vpset_binding_in_loop(const vpset& set, SYMTAB* sym, struct LOOP* loop);
void tell_loop_of_values(struct LOOP* loop, vpenv at_head);

// ---- vp_formals.cpp. Of a parameter that its function only reads, in the parameter's type
void enter_vpset_of_formal_parm(const class FUNINFO* f, const std::string& parm, const vpset& set);
// What all calls pass in the parameter of the current function, if that is known.
bool find_vpset_in_formal_parms(vpset* out, const SYMTAB* sym);

// While it lives, bounds of trees take in what the environment says.
class VALUES_AT : VARIABLE_VALUES {
public:
    explicit VALUES_AT(const vpenv* at) : env(at), outer(values_of_variables) { values_of_variables = this; }
    ~VALUES_AT() override { values_of_variables = outer; }
    VALUES_AT(const VALUES_AT&) = delete;
    VALUES_AT& operator=(const VALUES_AT&) = delete;
    bool bounds_of_variable(const SYMTAB* sym, INT65* min, INT65* max) const override;
    bool bounds_of_tree(const NODE* tree, INT65* min, INT65* max) const override;

private:
    const vpenv* env;
    const VARIABLE_VALUES* outer;
};

// ---- vp_builtins.cpp
// The evaluator of a built-in, or null: it has the arguments of `eval_expr_in_vpenv`.
using VPSET_EVALUATOR = vpenv (*)(vpset* out, const NODE* call, struct LOOP* loop, vpenv env, int assign);
VPSET_EVALUATOR vpset_evaluator_of(const NODE* call);
