// Common subexpressions of a block, and of the chain of blocks that each lead to one that is entered from nowhere else.
//
// Values are numbered: two trees have one number where they surely give the same value (Alpern, Wegman and Zadeck,
// Detecting Equality of Variables in Programs, 1988; here over a chain of blocks, which needs no fixpoint). A tree
// whose number a variable has is replaced by that variable. Otherwise its occurrences are remembered, and once they
// would save more than an assignment costs, the first of them is kept in a temporary ahead of its statement. A store
// gives the place the number of what is stored, so that a load behind it finds that; so does a compound assignment.
// What is assigned to a variable that has its number already is dropped. A remainder is computed from the quotient of
// its operands where that is known.
//
// Needs: alias marks, pointees, pointer groups, points-to. Leaves: what rests on the graph; symbols are split anew.
// Sound because a number stands for one value: an assignment gives its variable another, and the number of a load is
// forgotten where the place or its address may change. Trees without effects alone are numbered: in statements that
// evaluate all of them ahead of their one effect, and, in others, those that no effect among the operands may change, so
// that they have one value wherever they come in the order of evaluation; no variable that an operand writes stands for a
// value there. Of `*p + f()` the load may come first or last,
// and takes no part if the call may store there. The first occurrence is evaluated whenever its statement is, so that
// nothing is computed that was not; what may trap is no first occurrence beside a call that may not return. A chain ends
// where an exception may leave a statement in its middle.
#include "OPT5/scalar/lcse.h"

#include "OPT5/alias/alias.h"
#include "OPT5/alias/effects.h"
#include "OPT5/alias/points_to.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/rewrite_limit.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/scalar/subrange.h"
#include "OPT5/scalar/triples.h"
#include "OPT5/simp/seq.h"
#include "OPT5/target/bif.h"
#include "OPT5/target/target.h"

#include <algorithm>
#include <cmath>
#include <unordered_map>
#include <unordered_set>
#include <vector>

namespace {

using VALUE = int; // a value's number; 0: none
constexpr size_t MOST_LOADS = 32, MOST_HOLDERS = 4;
constexpr int MOST_NODES = 64; // of a tree that is worth looking for
constexpr double COST_OF_ASSIGNMENT = 1;
constexpr int MOST_GOAL_FOR_SIZE = 3;

bool is_assignment_of_private_name(const NODE* t) {
    return (t->op == ASG || is_operator_assignment(t)) && is_private_name(t->left) && !tree_has_side_effects(t->right);
}

// ---- The numbers of a chain

// A load whose place has not changed since, or a call of a function that reads memory.
struct LOAD {
    TREE_KEY key;
    NODE* lvalue; // a copy; of the call
    VALUE value;
    uint64_t names; // those that it mentions, by `mark_of`
};

// Symbols of different marks are different.
uint64_t mark_of(const SYMTAB* sym) { return uint64_t{1} << (static_cast<uint64_t>(sym->index) & 63); }

uint64_t marks_in(const NODE* t) {
    uint64_t marks = 0;
    for_each_subtree(t, [&marks](const NODE* n) {
        if (n->op == NAME && n->u.sym) marks |= mark_of(n->u.sym);
    });
    return marks;
}

class NUMBERS {
public:
    ~NUMBERS() { forget_loads(); }

    void restart() {
        forget_loads();
        numbers.restart();
        variables.clear();
    }

    VALUE fresh() { return numbers.fresh(); }
    VALUE of_variable(const SYMTAB* sym) {
        VALUE& v = variables[sym];
        return v ? v : v = fresh();
    }
    void assign(const SYMTAB* sym, VALUE v) { variables[sym] = v; }

    // Of a tree without effects.
    VALUE of(const NODE* t);
    int cost_of(const NODE* t); // of evaluating it
    void begin_statement() { known.clear(); }
    // Of `a op b` in the type of a variable, or a place, that has the number `a` and is stepped by `b`.
    VALUE of_step(const NODE* asg, VALUE a, VALUE b);

    // Of the quotient that belongs to a remainder.
    VALUE of_quotient(const NODE* remainder) {
        const VALUE a = of(remainder->left), b = of(remainder->right);
        return numbers.of({DIV, type_code(remainder->type), type_code(remainder->left->type), a, b});
    }

    void stored(const NODE* lvalue, VALUE v) {
        begin_statement(); // the place may hold temporaries now
        const TREE_KEY key = key_of_load(lvalue);
        if (key.code) enter_load(key, lvalue, v);
    }
    // What evaluating `t` changes has no known value any more.
    void forget_changed(const NODE* t) {
        for_each_written_name(t, [this](const NODE* name, const NODE*) { variables[name->u.sym] = fresh(); });
        // A variable that only its name reaches matters to the loads that mention it.
        const uint64_t mark = is_assignment_of_private_name(t) ? mark_of(t->left->u.sym) : 0;
        auto gone = [t, mark](const LOAD& l) {
            if (mark && !(l.names & mark)) return false;
            if (!tree_modifies_lvalue_in_tree(t, l.lvalue)) return false;
            erase_tree(l.lvalue);
            return true;
        };
        loads.erase(std::remove_if(loads.begin(), loads.end(), gone), loads.end());
    }

private:
    struct KNOWN {
        VALUE value = 0;
        int cost = -1;
    };

    VALUE find(const NODE* t);
    VALUE of_name(const NODE* t);
    VALUE of_load(const NODE* t);
    VALUE of_operator(const NODE* t);
    VALUE of_address(const NODE* place);
    VALUE of_call(const NODE* t);
    TREE_KEY key_of_load(const NODE* t);
    VALUE of_reading(const TREE_KEY& key, const NODE* t);

    void enter_load(const TREE_KEY& key, const NODE* lvalue, VALUE v) {
        if (count_nodes_in_tree(lvalue) > MOST_NODES) return;
        if (loads.size() == MOST_LOADS) {
            erase_tree(loads.front().lvalue);
            loads.erase(loads.begin());
        }
        loads.push_back({key, copy_tree(lvalue), v, marks_in(lvalue)});
        carry_PT_info(loads.back().lvalue, lvalue); // which stands ahead, and its pointer has not changed since
    }
    void forget_loads() {
        for (const LOAD& l : loads) erase_tree(l.lvalue);
        loads.clear();
    }

    TREE_NUMBERS numbers;
    FLAT_MAP<const SYMTAB*, VALUE> variables;
    std::vector<LOAD> loads;
    FLAT_MAP<const NODE*, KNOWN> known; // of the trees of one statement
};

VALUE NUMBERS::of(const NODE* t) {
    const KNOWN* k = known.find(t);
    if (k && k->value) return k->value;
    const VALUE v = find(t);
    return known[t].value = v;
}

int NUMBERS::cost_of(const NODE* t) {
    const KNOWN* k = known.find(t);
    if (k && k->cost >= 0) return k->cost;
    int sum = t->op == NAME && good_CSE_tree(t, false) ? 1 : weight_of_operator(t);
    if (t->left) sum += cost_of(t->left);
    if (t->right) sum += cost_of(t->right);
    return known[t].cost = std::min(sum, 1 << 20);
}

VALUE NUMBERS::find(const NODE* t) {
    switch (t->op) {
    case NAME: return of_name(t);
    case ICON:
    case FCON: return type_code(t->type) ? numbers.of(key_of_constant(t)) : fresh();
    case UAND: return of_address(t->left);
    case UMULT:
    case STDOT:
    case STREF: return of_load(t);
    case ISP2CHAR: return t->left->type->is_pointer() && t->type->is_pointer() ? of(t->left) : fresh();
    case CALL:
    case ICALL: return of_call(t);
    default: return op_is_computed(t->op) ? of_operator(t) : fresh();
    }
}

VALUE NUMBERS::of_name(const NODE* t) {
    const SYMTAB* sym = t->u.sym;
    if (!sym || !types_are_close_enough(t->type, sym->type)) return fresh();
    return is_private_name(t) ? of_variable(sym) : of_load(t);
}

VALUE NUMBERS::of_operator(const NODE* t) {
    const unsigned code = type_code(t->type), from = type_code(t->left->type);
    if (!code || !from || (from == 1 && t->op == MINUS && code != 1)) return fresh(); // a difference counts elements
    VALUE a = of(t->left), b = t->right ? of(t->right) : 0;
    if (t->op == PCONV && code == from) return a; // between pointers
    if (commute_inv[t->op] == t->op && b < a) std::swap(a, b);
    // What a compare compares, and a cast converts from, its own type does not tell.
    return numbers.of({t->op, code, t->type->is_pointer() ? 0 : from, a, b});
}

VALUE NUMBERS::of_call(const NODE* t) {
    bool reads_memory = false;
    const void* callee = computing_callee(t, &reads_memory);
    if (!callee || !type_code(t->type)) return fresh();
    NODE* list = get_arguments_to_call(t);
    VALUE arguments = 0;
    for (int i = 0, n = arg_list_count(list); i < n; ++i)
        arguments = numbers.of({COMMA, 0, 0, arguments, of(arg_list_lookup(list, i))});
    const TREE_KEY key{t->op, type_code(t->type), identity(callee), arguments, 0};
    return reads_memory ? of_reading(key, t) : numbers.of(key);
}

VALUE NUMBERS::of_address(const NODE* place) {
    int64_t offset = 0;
    place = without_members(place, &offset);
    if (place->op == NAME && place->u.sym && offset == static_cast<VALUE>(offset))
        return numbers.of({UAND, 1, identity(place->u.sym), static_cast<VALUE>(offset), 0});
    return fresh();
}

// The key has no code where a tree is no load of a plain scalar.
TREE_KEY NUMBERS::key_of_load(const NODE* t) {
    const TREE_KEY none{t->op, 0, 0, 0, 0};
    const unsigned code = type_code(t->type);
    if (!code || lvalue_is_volatile(t)) return none;
    if ((t->op == STDOT || t->op == STREF) && t->right->mval->is_bitfld) return none;
    int64_t offset = 0;
    const NODE* place = without_members(t, &offset);
    if (place->op == STREF) offset += place->right->mval->offset;
    if (offset != static_cast<VALUE>(offset)) return none;
    const auto at = static_cast<VALUE>(offset);
    if (place->op == NAME && place->u.sym && !place->u.sym->is_function())
        return {NAME, code, identity(place->u.sym), at, 0};
    if ((place->op == UMULT && !place->right) || place->op == STREF) return {UMULT, code, 0, at, of(place->left)};
    return none;
}

VALUE NUMBERS::of_load(const NODE* t) {
    const TREE_KEY key = key_of_load(t);
    return key.code ? of_reading(key, t) : fresh();
}

VALUE NUMBERS::of_reading(const TREE_KEY& key, const NODE* t) {
    for (const LOAD& l : loads)
        if (l.key == key) return l.value;
    const VALUE v = fresh();
    enter_load(key, t, v);
    return v;
}

VALUE NUMBERS::of_step(const NODE* asg, VALUE a, VALUE b) {
    const int op = op_of_opASG[asg->op];
    const unsigned code = type_code(asg->left->type), by = type_code(asg->right->type);
    const bool is_plain = op_is_computed(op) && code && (code == by || (code == 1 && asg->right->type->is_int()));
    if (!is_plain) return fresh();
    if (commute_inv[op] == op && b < a) std::swap(a, b);
    return numbers.of({op, code, code == 1 ? 0 : code, a, b});
}

// ---- The trees of a chain

// What is known of a value: which variables have it, or where it was computed first and is computed again.
struct OCCURRENCES {
    std::vector<SYMTAB*> holders;
    NODE** first = nullptr;            // null: nowhere that it can be kept from
    LIST* cell = nullptr;              // the statement of that
    bool is_step = false;              // it is what a compound assignment, the whole statement, stores
    int order = 0;                     // behind that of all of its operands
    size_t block = 0;                  // the place in the chain
    double gain = -COST_OF_ASSIGNMENT; // of keeping it
    std::vector<NODE**> later;
};

class COMMON_SUBEXPRESSIONS {
public:
    // Whether anything was taken away or kept.
    bool run() {
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
            const EDGE* before = bb->predecessors;
            if (!chain_end || !before || before->rest || before->first != chain_end) end_chain();
            block(bb);
        }
        end_chain();
        if (has_new_symbols) sym_split(currfuninfo);
        return has_changed;
    }

private:
    void block(BBLK* bb);
    void end_chain();
    void statement(LIST* s);
    void mixed_statement(NODE* t);
    void assignment(LIST* s);
    bool is_redundant(const NODE* t);
    void learn_store(const NODE* t, VALUE v);
    void read(NODE*& slot, bool is_certain);
    auto reader() {
        return [this](NODE*& slot, bool is_certain) { read(slot, is_certain); };
    }
    void read_operands(NODE* t, bool is_certain);
    void read_place(NODE* t, bool is_certain) { for_each_read_of_place(t, is_certain, reader()); }
    bool reuse(NODE*& slot, bool is_certain);
    bool has_quotient(const NODE* remainder);
    SYMTAB* holder_of(const OCCURRENCES& known, VALUE v, const TYPE* type);
    void keep(OCCURRENCES& known, VALUE v);
    NODE* take_first(OCCURRENCES& known, SYMTAB* variable);

    NUMBERS numbers;
    std::unordered_map<VALUE, OCCURRENCES> values; // looked up, never walked
    STATEMENTS_AHEAD ahead;
    MIXED_READS mixed;         // of the statement in work
    std::unordered_set<const NODE*> left_in_memory; // operands of it that the multiply reads there; membership only
    std::vector<BBLK*> blocks; // of the chain
    const BBLK* chain_end = nullptr;
    LIST* current = nullptr;
    int order = 0;
    long dropped = 0;
    bool has_new_symbols = false, has_changed = false;
};

void COMMON_SUBEXPRESSIONS::block(BBLK* bb) {
    blocks.push_back(bb);
    chain_end = bb;
    bool any_dropped = false;
    for (LIST* s = bb->statements; s; s = s->rest) {
        statement(s);
        any_dropped |= !s->first;
        if (s->first && tree_is_EH_SWITCH(s->first)) chain_end = nullptr;
    }
    if (any_dropped) drop_empty_cells(&bb->statements);
}

void COMMON_SUBEXPRESSIONS::end_chain() {
    if (!ahead.empty())
        for (BBLK* bb : blocks) insert_statements_ahead(bb, ahead);
    ahead.clear();
    blocks.clear();
    values.clear();
    numbers.restart();
    chain_end = nullptr;
}

void COMMON_SUBEXPRESSIONS::statement(LIST* s) {
    NODE* t = s->first;
    current = s;
    for_each_subtree(t, [](NODE* n) {
        if ((n->op == UMULT && !n->right) || n->op == STREF) n->left = normalize_ptr_for_indexing(n->left);
    });
    numbers.begin_statement();
    left_in_memory.clear();
    if (!reads_come_first(t)) {
        mixed_statement(t);
        numbers.forget_changed(t);
        return;
    }
    switch (t->op) {
    case RETURN:
        if (t->right) read(t->right, true);
        return;
    case IF: // its own compare stays what the control flow is read from
    case SWITCH: read_operands(t->left, true); return;
    case CALL:
        read_operands(t, true);
        numbers.forget_changed(t);
        return;
    default: assignment(s);
    }
}

// The operands that keep their value throughout take part; what is assigned is not learned.
void COMMON_SUBEXPRESSIONS::mixed_statement(NODE* t) {
    if (mixed.enter(t)) for_each_read_of_mixed(t, reader());
    mixed.clear();
}

bool COMMON_SUBEXPRESSIONS::is_redundant(const NODE* t) {
    return t->op == ASG && is_private_name(t->left) && (t->right->op != CALL || is_computing_call(t->right)) &&
           types_are_close_enough(t->left->type, t->right->type) && numbers.of(t->right) == numbers.of(t->left);
}

void COMMON_SUBEXPRESSIONS::assignment(LIST* s) {
    NODE* t = s->first;
    if (is_redundant(t)) {
        if (print_debug) {
            debug_printf("\n\t(%ld) REDUNDANT ASSIGNMENT ELIMINATED IN LCSE:\n", ++dropped);
            debug_printf("%s\n", stmt2infix(t).c_str());
        }
        erase_tree(t);
        s->first = nullptr;
        has_changed = true;
        return;
    }
    VALUE v = 0;
    const bool is_plain = t->op == ASG || t->op == STASG;
    if ((t->right->op == CALL && !is_computing_call(t->right)) || t->op == STASG) {
        read_operands(t->right, true);
        if (t->op == ASG) v = numbers.fresh(); // a call's
    } else {
        v = numbers.of(t->right);
        if (!is_plain) v = numbers.of_step(t, numbers.of(t->left), v);
        read(t->right, true);
    }
    // The alias rules are asked about the address as it was, not about a temporary.
    NODE* place = t->left->op == NAME ? nullptr : copy_tree(t->left);
    if (place) carry_PT_info(place, t->left);
    read_place(t->left, true);
    if (place) std::swap(t->left, place);
    numbers.forget_changed(t);
    if (v && (!is_plain || types_are_close_enough(t->left->type, t->right->type))) learn_store(t, v);
    if (!place) return;
    std::swap(t->left, place);
    erase_tree(place);
    numbers.begin_statement();
}

// Whether `x op= e` is `x = x op e` in the type of x.
bool holds_step(const NODE* t) {
    return op_of_opASG[t->op] != ILLOP && t->left->type->is_int() &&
           compound_ASG_computes_in(t->left->type->stqs(), op_of_opASG[t->op], t->left, t->right);
}

// Neither a constant nor a variable: what would have to be computed, or loaded, again.
bool is_computed_value(const NODE* t) {
    while (t->op == SCONV || t->op == PCONV || t->op == ISP2CHAR) {
        if (t->left->type->is_float() != t->type->is_float()) break;
        t = t->left;
    }
    return number_of_operands[t->op] != 0 && t->op != NAME && t->op != UAND;
}

// The target has the value from here on.
void COMMON_SUBEXPRESSIONS::learn_store(const NODE* t, VALUE v) {
    const NODE* to = t->left;
    if (is_private_name(to)) {
        if (!types_are_close_enough(to->type, to->u.sym->type)) return;
        numbers.assign(to->u.sym, v);
        if (to->u.sym->type->qual_kind(false) & QUAL_RESTRICT) return; // what it points to would count as reached by it
        std::vector<SYMTAB*>& holders = values[v].holders;
        if (holders.size() == MOST_HOLDERS) holders.erase(holders.begin());
        holders.push_back(to->u.sym);
        return;
    }
    const NODE* object = without_members(to);
    if (object->op != NAME && tree_modifies_lvalue_in_tree(t, object->left)) return;
    numbers.stored(to, v);
    OCCURRENCES& known = values[v];
    if (known.first || !(t->op == ASG ? is_computed_value(t->right) : holds_step(t))) return;
    known.is_step = t->op != ASG;
    known.first = known.is_step ? &current->first : &current->first->right;
    known.cell = current;
    known.order = ++order;
    known.block = blocks.size();
    if (known.is_step) known.gain -= 1 + numbers.cost_of(to);
}

// ---- Reads

void COMMON_SUBEXPRESSIONS::read(NODE*& slot, bool is_certain) {
    if (!slot || (number_of_operands[slot->op] == 0 && !good_CSE_tree(slot, false))) return;
    if (mixed.is_out(slot) || !reuse(slot, is_certain)) read_operands(slot, is_certain);
}

// Where size counts, an operand that the multiply reads from memory gets no temporary: that would be an instruction more.
void COMMON_SUBEXPRESSIONS::read_operands(NODE* t, bool is_certain) {
    if (t->op == MULT && size_speed_goal() <= MOST_GOAL_FOR_SIZE) {
        const unsigned from_memory = mpy16_memory_operands(t);
        if (from_memory & 1) left_in_memory.insert(without_mpy16_cast(t->left));
        if (from_memory & 2) left_in_memory.insert(without_mpy16_cast(t->right));
    }
    for_each_operand_read(t, is_certain, reader());
}

SYMTAB* COMMON_SUBEXPRESSIONS::holder_of(const OCCURRENCES& known, VALUE v, const TYPE* type) {
    for (auto it = known.holders.rbegin(); it != known.holders.rend(); ++it)
        if (!mixed.writes(*it) && numbers.of_variable(*it) == v && types_are_close_enough((*it)->type, type)) return *it;
    return nullptr;
}

bool COMMON_SUBEXPRESSIONS::has_quotient(const NODE* t) {
    if (t->op != MOD || !type_code(t->type) || !type_code(t->left->type)) return false;
    const VALUE v = numbers.of_quotient(t);
    const OCCURRENCES& known = values[v];
    return known.first || holder_of(known, v, t->type);
}

// x % y as x - x / y * y, which cannot overflow where the quotient does not.
NODE* remainder_by_quotient(NODE* t) {
    TYPE* type = t->type->stqs();
    NODE* quotient = maketree(DIV, copy_tree(t->left), copy_tree(t->right), type, t->ls);
    NODE* product = maketree(MULT, quotient, t->right, type, t->ls);
    NODE* r = maketree(MINUS, t->left, product, type, t->ls);
    erase_node(t);
    return r;
}

// False where the operands are still to be looked at.
bool COMMON_SUBEXPRESSIONS::reuse(NODE*& slot, bool is_certain) {
    if (has_quotient(slot)) {
        slot = remainder_by_quotient(slot);
        has_changed = true;
        numbers.begin_statement();
    }
    NODE* t = slot;
    if (!good_CSE_tree(t, false) || !type_code(t->type)) return false;
    if (!op_is_computed(t->op) && !op_is_load(t->op) && t->op != NAME && !is_computing_call(t)) return false;
    const VALUE v = numbers.of(t);
    OCCURRENCES& known = values[v];
    if (SYMTAB* holder = holder_of(known, v, t->type)) {
        if (!rewrite_is_allowed(t)) return false;
        slot = coerce_to_type(t->type->stqs(), mk_NAME(holder, t->ls));
        erase_tree(t);
        has_changed = true;
        return true;
    }
    if (left_in_memory.count(t)) return false;
    if (!known.first) {
        if (!is_certain || mixed.must_stay(t)) return false;
        known.first = &slot;
        known.cell = current;
        known.block = blocks.size();
        read_operands(t, is_certain);
        known.order = ++order;
        return true;
    }
    if (!rewrite_is_allowed(t)) return false;
    known.later.push_back(&slot);
    // A block further on is entered every other time.
    known.gain += std::ldexp(numbers.cost_of(t), static_cast<int>(known.block) - static_cast<int>(blocks.size()));
    if (known.gain > 0) keep(known, v);
    return true;
}

// What the first occurrence computes, which a NAME of the variable then stands for.
NODE* COMMON_SUBEXPRESSIONS::take_first(OCCURRENCES& known, SYMTAB* variable) {
    NODE* t = *known.first;
    if (!known.is_step) {
        *known.first = mk_NAME(variable, t->ls);
        return t;
    }
    *known.first = mk_ASG(copy_tree(t->left), mk_NAME(variable, t->ls));
    t->op = op_of_opASG[t->op];
    t->type = t->left->type->stqs();
    return t;
}

void COMMON_SUBEXPRESSIONS::keep(OCCURRENCES& known, VALUE v) {
    const NODE* first = *known.first;
    SYMTAB* variable = sym_temp('N', -1, first->type->stqs(), first->ls);
    NODE* value = take_first(known, variable);
    NODE* assignment = mk_ASG(mk_NAME(variable, value->ls), value);
    ahead[known.cell].push_back({known.order, assignment});
    for (NODE** slot : known.later) {
        NODE* t = *slot;
        *slot = coerce_to_type(t->type->stqs(), mk_NAME(variable, t->ls));
        erase_tree(t);
    }
    known.later.clear();
    known.first = nullptr;
    numbers.assign(variable, v);
    known.holders.push_back(variable);
    has_new_symbols = has_changed = true;
}

} // namespace

void lcse() {
    if (!currfuninfo || !currfuninfo->bb_list) return;
    need(fact::alias | fact::points_to);
    const bool any = COMMON_SUBEXPRESSIONS().run();
    changed(any ? fact::graph : fact::graph | fact::alias_marks);
}
