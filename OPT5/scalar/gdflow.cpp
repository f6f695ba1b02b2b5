// The expressions of a function and where each is computed and changed: what global common subexpressions are found
// from.
//
// Trees with one number are the same computation on the same variables and places; whether these hold the same values
// is what the sites and the writes tell, each with its block and the position of its statement there. Nothing is kept
// for each expression and block: an expression meets few of either. What is computed in one block only, and in no cycle,
// has its sites counted and no more.
#include "OPT5/scalar/gdflow.h"

#include "FPSIM/fpsim.h"
#include "OPT5/alias/effects.h"
#include "OPT5/alias/points_to.h"
#include "OPT5/ir/facts.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/loops.h"
#include "OPT5/ir/statements.h"
#include "OPT5/ir/trees.h"
#include "OPT5/scalar/lcse.h"
#include "OPT5/scalar/subrange.h"
#include "OPT5/scalar/triples.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/linear.h"
#include "OPT5/target/bif.h"

#include <boost/container_hash/hash.hpp>

#include <algorithm>
#include <unordered_map>

unsigned type_code(const TYPE* t) {
    if (t->is_pointer()) return 1;
    if (t->is_float() && !t->is_complex()) return 2 | t->size << 4;
    if ((t->is_int() || t->is_enum()) && !t->is_bool()) return (t->is_unsigned() ? 3u : 4u) | t->size << 4;
    return 0;
}

size_t TREE_KEY_HASH::operator()(const TREE_KEY& k) const {
    size_t h = 0;
    boost::hash_combine(h, k.op);
    boost::hash_combine(h, k.code);
    boost::hash_combine(h, k.payload);
    boost::hash_combine(h, k.a);
    boost::hash_combine(h, k.b);
    return h;
}

TREE_KEY key_of_constant(const NODE* t) {
    const unsigned code = type_code(t->type);
    if (t->op == ICON) return {ICON, code, t->u.lval.value, t->u.lval.sign, 0};
    const uint16_t* m = t->u.fval->mant;
    const uint64_t high = uint64_t{m[0]} << 48 | uint64_t{m[1]} << 32 | uint64_t{m[2]} << 16 | m[3];
    return {FCON, code, high, m[4] << 16 | m[5], t->u.fval->exp * 2 + t->u.fval->sign};
}

TREE_KEY preconflate_NAME(const NODE* t) { return {NAME, type_code(t->type), identity(t->u.sym), 0, 0}; }

bool is_computing_call(const NODE* t) {
    bool reads_memory = false;
    return computing_callee(t, &reads_memory) != nullptr;
}

bool op_is_computed(int op) {
    if (op == EXCLAIM || op == SCONV || op == PCONV || op == PMCONV) return true;
    return op_is_arithmetic(op) || op_is_int_compare(op) || op_is_float_compare(op);
}

int weight_of_operator(const NODE* t) {
    constexpr int DIVISION = 16, CALL_OF_FUNCTION = 8;
    if (t->op == SCONV || t->op == PCONV || t->op == ISP2CHAR || t->op == COMMA || number_of_operands[t->op] == 0)
        return 0;
    if (t->op == DIV || t->op == MOD) return DIVISION;
    if (op_is_call(t->op)) return CALL_OF_FUNCTION;
    return t->op == UMULT || t->op == STREF ? 2 : 1;
}

bool reads_come_first(const NODE* t) {
    auto acts = [](const NODE* n) { return n && !tree_changes_nothing(n); };
    switch (t->op) {
    case RETURN: return !acts(t->right);
    case IF:
    case SWITCH: return t->left->op != ENDLOOP && !acts(t->left);
    case CALL: return !acts(t->left) && !acts(t->right);
    case ASG:
        if (tree_is_arg_prolog(t) || acts(t->left)) return false;
        return t->right->op == CALL ? reads_come_first(t->right) : !acts(t->right);
    case STASG:
        if (tree_is_arg_prolog(t) || acts(t->left)) return false;
        return t->right->op == CALL ? reads_come_first(t->right) : !acts(t->right);
    default: return is_operator_assignment(t) && t->right && !acts(t->left) && !acts(t->right);
    }
}

void insert_statements_ahead(BBLK* bb, STATEMENTS_AHEAD& ahead) {
    LIST** pragmas = nullptr;
    for (LIST** link = &bb->statements; *link; link = &(*link)->rest) {
        auto it = ahead.find(*link);
        if (it != ahead.end()) {
            LIST** at = pragmas ? pragmas : link;
            LIST* statement = *link;
            std::sort(it->second.begin(), it->second.end(),
                      [](const KEPT& a, const KEPT& b) { return a.order < b.order; });
            for (const KEPT& kept : it->second) at = &(*insert_before(at, kept.assignment, statement->psn));
            while (*link != statement) link = &(*link)->rest;
        }
        if ((*link)->first->op != PPRAGMA)
            pragmas = nullptr;
        else if (!pragmas)
            pragmas = link;
    }
}

std::vector<TRIPLE> unique_triples;
size_t unique_triple_count, triple_site_count;
Triple_Alias_Table triples_alias_table;

bool TRIPLE_SITES::is_worth_a_look() const {
    if (empty()) return false;
    return front().block != back().block || currfuninfo->loops->around(front().bb) || currfuninfo->loops->has_other_cycles();
}

namespace {

constexpr int NO_TRIPLE = -1, MOST_NODES = 64;
constexpr size_t MOST_RENEWALS = 8; // assignments of a variable that are looked at for each triple
constexpr double LEAST_COST_TO_RENEW = 2;

std::unordered_map<const SYMTAB*, std::vector<TRIPLE_WRITE>> variable_writes; // looked up, never walked
std::vector<TRIPLE_WRITE> memory_writes, staying;
std::vector<TRIPLE_SITE> all_sites; // by triple

// Of variables to which a constant amount is added by whole statements, these and the other writes. Looked up, never walked.
std::unordered_map<const SYMTAB*, std::vector<TRIPLE_STEP>> variable_steps;
std::unordered_map<const SYMTAB*, std::vector<TRIPLE_WRITE>> other_writes;

// The number of a tree says what it is; the triple, where it is computed.
class ANNOTATOR {
public:
    void run() {
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
            int position = 0;
            for (LIST* s = bb->statements; s; s = s->rest) statement(bb, s, ++position);
        }
        known.clear();
        sort_sites();
        share_PT_info_of_loads();
        make_triples();
        find_renewals();
    }

private:
    struct KNOWN {
        int number = NO_TRIPLE;
        double cost = 0;
        int nodes = 1;
    };

    void statement(BBLK* bb, LIST* cell, int position);
    void enter_writes(const BBLK* bb, const NODE* t, int position);
    void read(NODE*& slot, bool is_certain);
    auto reader() {
        return [this](NODE*& slot, bool is_certain) { read(slot, is_certain); };
    }
    void read_operands(NODE* t, bool is_certain) { for_each_operand_read(t, is_certain, reader()); }
    void read_place(NODE* t, bool is_certain) { for_each_read_of_place(t, is_certain, reader()); }
    KNOWN number(const NODE* t);
    KNOWN find(const NODE* t);
    KNOWN number_of_leaf(const NODE* t);
    KNOWN number_of_call(const NODE* t);
    int number_of_key(const TREE_KEY& key) {
        if (!replaced) return numbers.of(key);
        const int* at = numbers.find(key);
        return at ? *at : NO_TRIPLE;
    }
    void sort_sites();
    void make_triples();
    size_t triple_of(int number);
    TRIPLE new_triple(int number);
    void find_lvalues_of(TRIPLE& t);
    static void find_writes_of(TRIPLE& t);
    void read_value(NODE* assignment);
    void find_renewals();
    void find_renewals_of(size_t triple);
    static TREE_KEY shape_of(const NODE* tree, double cost) {
        return {tree->op, type_code(tree->type), static_cast<uint64_t>(cost * 2), 0, 0};
    }
    void share_PT_info_of_loads();

    TREE_NUMBERS numbers;
    MIXED_READS mixed; // of the statement in work
    FLAT_MAP<const NODE*, KNOWN> known; // of the trees of one statement
    struct SITE {
        int number;
        float cost;
        TRIPLE_SITE place;
    };
    std::vector<SITE> sites; // in the order of the walk
    struct ENTRY {
        size_t begin = 0, end = 0; // of its sites among all
        size_t triple = NONE;
        float cost = 0;
    };
    static constexpr size_t NONE = SIZE_MAX;
    std::vector<ENTRY> entries;             // by number
    std::vector<int> in_order;              // the numbers with sites, in order of the first of them
    std::vector<std::pair<int, NODE*>> loads; // by number
    struct ASSIGNMENT {
        TRIPLE_RENEWAL place;
        int value; // the number of what is assigned
        double cost;
    };
    std::unordered_map<const SYMTAB*, std::vector<ASSIGNMENT>> assignments; // looked up, never walked
    // A variable that counts as its value has the number, and trees without a number get none, while this is set.
    const SYMTAB* replaced = nullptr;
    int replaced_by = NO_TRIPLE;
    FLAT_MAP<TREE_KEY, int, TREE_KEY_HASH> shapes; // how many triples have one operator, type and cost
    BBLK* block = nullptr;
    LIST* cell = nullptr;
    int position = 0;
    int pointers_around = 0;
};

void ANNOTATOR::enter_writes(const BBLK* bb, const NODE* t, int at) {
    const TRIPLE_WRITE here{bb->dfn, at, t};
    bool writes_memory = false;
    for_each_write(t, [&](const WRITE& w) {
        const NODE* name = w.place ? name_of_place(w.place) : nullptr;
        if (!name || !only_its_name_reaches(name->u.sym)) {
            writes_memory = true;
            return;
        }
        variable_writes[name->u.sym].push_back(here);
    });
    const bool acts = writes_memory || tree_has_side_effects(t);
    if (writes_memory) memory_writes.push_back(here);
    if (acts && may_leave_in_the_middle(t)) staying.push_back(here);
}

ANNOTATOR::KNOWN ANNOTATOR::number_of_leaf(const NODE* t) {
    KNOWN k;
    if (replaced && t->op == NAME && t->u.sym == replaced)
        k.number = replaced_by;
    else if (t->op == NAME && t->u.sym && !t->u.sym->is_function())
        k.number = number_of_key(preconflate_NAME(t));
    else if ((t->op == ICON || t->op == FCON) && type_code(t->type))
        k.number = number_of_key(key_of_constant(t));
    return k;
}

ANNOTATOR::KNOWN ANNOTATOR::number_of_call(const NODE* t) {
    bool reads_memory = false;
    const void* callee = computing_callee(t, &reads_memory);
    if (!callee || !type_code(t->type)) return {};
    KNOWN k;
    k.cost = weight_of_operator(t);
    NODE* list = get_arguments_to_call(t);
    int arguments = 0;
    for (int i = 0, n = arg_list_count(list); i < n; ++i) {
        const KNOWN a = number(arg_list_lookup(list, i));
        if (a.number == NO_TRIPLE) return {};
        k.cost += a.cost;
        k.nodes += a.nodes;
        arguments = number_of_key({COMMA, 0, 0, arguments, a.number});
    }
    if (k.nodes > MOST_NODES) return {};
    k.number = number_of_key({t->op, type_code(t->type), identity(callee), arguments, 0});
    return k;
}

ANNOTATOR::KNOWN ANNOTATOR::number(const NODE* t) {
    if (replaced) return find(t);
    if (const KNOWN* k = known.find(t)) return *k;
    const KNOWN k = find(t);
    return known[t] = k;
}

ANNOTATOR::KNOWN ANNOTATOR::find(const NODE* t) {
    if (number_of_operands[t->op] == 0 || t->op == NAME) return number_of_leaf(t);
    if (t->op == CALL || t->op == ICALL) return number_of_call(t);
    const bool is_member = t->op == STDOT || t->op == STREF;
    const bool is_load = t->op == UMULT || is_member;
    if ((!op_is_computed(t->op) && !is_load && t->op != UAND && t->op != ISP2CHAR) ||
        (is_load && lvalue_is_volatile(t)))
        return {};
    if (is_member && (!t->right->mval || t->right->mval->is_bitfld)) return {};
    const unsigned code = type_code(t->type);
    if (!code && !is_load) return {};
    const KNOWN a = number(t->left), b = t->right && !is_member ? number(t->right) : KNOWN();
    if (a.number == NO_TRIPLE || (t->right && !is_member && b.number == NO_TRIPLE)) return {};
    KNOWN k;
    k.nodes = a.nodes + b.nodes + 1;
    if (k.nodes > MOST_NODES) return {};
    k.cost = a.cost + b.cost + (t->op == UMULT ? 1.5 : weight_of_operator(t));
    const uint64_t payload = is_member ? t->right->mval->offset : is_load ? t->type->size : type_code(t->left->type);
    int x = a.number, y = b.number;
    if (t->right && !is_member && commute_inv[t->op] == t->op && y < x) std::swap(x, y);
    k.number = number_of_key({t->op, code, payload, x, y});
    if (!replaced && (t->op == UMULT || t->op == STREF)) loads.emplace_back(k.number, const_cast<NODE*>(t));
    return k;
}

// x = ... is the whole statement, and the only effect of it.
bool assigns_variable(const NODE* t) {
    return t->op == ASG && is_private_name(t->left) && tree_changes_nothing(t->right) &&
           types_are_close_enough(t->left->type, t->right->type) &&
           types_are_close_enough(t->left->u.sym->type, t->left->type);
}

// Sites by number. Blocks come in text order, the sites of a triple in order of their numbers.
void ANNOTATOR::sort_sites() {
    entries.resize(static_cast<size_t>(numbers.most()) + 1);
    auto entry_of = [this](const SITE& s) -> ENTRY& { return entries[static_cast<size_t>(s.number)]; };
    for (const SITE& s : sites)
        if (entry_of(s).end++ == 0) {
            entry_of(s).cost = s.cost;
            in_order.push_back(s.number);
        }
    size_t begin = 0;
    for (ENTRY& e : entries) {
        e.begin = begin;
        begin += e.end;
        e.end = e.begin;
    }
    all_sites.resize(sites.size());
    for (const SITE& s : sites) all_sites[entry_of(s).end++] = s.place;
    auto is_ahead = [](const TRIPLE_SITE& a, const TRIPLE_SITE& b) { return a.block < b.block; };
    for (const ENTRY& e : entries) {
        TRIPLE_SITE *first = all_sites.data() + e.begin, *past = all_sites.data() + e.end;
        if (!std::is_sorted(first, past, is_ahead)) std::stable_sort(first, past, is_ahead);
    }
    unique_triple_count = in_order.size();
    triple_site_count = sites.size();
    std::vector<SITE>().swap(sites);
}

void ANNOTATOR::make_triples() {
    if (unique_triple_count < 1) return;
    need(fact::loops);
    for (int number : in_order) {
        const ENTRY& e = entries[static_cast<size_t>(number)];
        if (TRIPLE_SITES{all_sites.data() + e.begin, all_sites.data() + e.end}.is_worth_a_look()) triple_of(number);
    }
}

// The place of the triple with the number, which is made if it has sites.
size_t ANNOTATOR::triple_of(int number) {
    if (static_cast<size_t>(number) >= entries.size()) return NONE;
    ENTRY& e = entries[static_cast<size_t>(number)];
    if (e.triple != NONE || e.begin == e.end) return e.triple;
    e.triple = unique_triples.size();
    unique_triples.push_back(new_triple(number));
    return e.triple;
}

void ANNOTATOR::find_renewals_of(size_t triple) {
    std::vector<TRIPLE_RENEWAL> found;
    const NODE* tree = unique_triples[triple].tree;
    const double cost = unique_triples[triple].cost;
    for (const SYMTAB* x : unique_triples[triple].variables) {
        auto at = assignments.find(x);
        if (at == assignments.end()) continue;
        for (size_t i = 0; i < std::min(at->second.size(), MOST_RENEWALS); ++i) {
            const double more_cost = at->second[i].cost; // of what the variable stands for, once
            const int* like = shapes.find(shape_of(tree, cost + more_cost));
            if (!like || *like <= (more_cost == 0 ? 1 : 0)) continue;
            replaced = x;
            replaced_by = at->second[i].value;
            const KNOWN other = find(tree);
            replaced = nullptr;
            if (other.number == NO_TRIPLE) continue;
            // A new one comes behind those that are walked here.
            const size_t as = triple_of(other.number);
            if (as == NONE || as == triple) continue;
            found.push_back(at->second[i].place);
            found.back().other = as;
        }
    }
    std::stable_sort(found.begin(), found.end(), [](const TRIPLE_RENEWAL& a, const TRIPLE_RENEWAL& b) {
        return a.block != b.block ? a.block < b.block : a.position < b.position;
    });
    unique_triples[triple].renewals = std::move(found);
}

void ANNOTATOR::find_renewals() {
    if (assignments.empty()) return;
    for (int number : in_order) {
        const ENTRY& e = entries[static_cast<size_t>(number)];
        if (e.cost >= LEAST_COST_TO_RENEW) ++shapes[shape_of(*all_sites[e.begin].slot, e.cost)];
    }
    for (size_t i = 0, n = unique_triples.size(); i < n; ++i)
        if (unique_triples[i].cost >= LEAST_COST_TO_RENEW) find_renewals_of(i);
}

// The tree of a triple is asked about for all its sites.
void ANNOTATOR::share_PT_info_of_loads() {
    std::stable_sort(loads.begin(), loads.end(), [](const auto& a, const auto& b) { return a.first < b.first; });
    std::vector<NODE*> accesses;
    for (size_t i = 0; i < loads.size(); ++i) {
        accesses.push_back(loads[i].second);
        if (i + 1 < loads.size() && loads[i + 1].first == loads[i].first) continue;
        share_PT_info(accesses);
        accesses.clear();
    }
}

void ANNOTATOR::find_lvalues_of(TRIPLE& t) {
    known.clear();
    for (const NODE* n : lvalues_read_in(t.tree)) {
        const int of_lvalue = number(n).number;
        if (of_lvalue == NO_TRIPLE)
            t.is_asked_whole = true;
        else if (!is_private_name(n))
            t.lvalues.push_back(triples_alias_table.number_of(of_lvalue, n));
    }
}

// How many x a tree adds up, modulo 2^width, times `by`. False where it is no such sum.
bool add_coefficient(const NODE* t, const SYMTAB* x, uint64_t width, uint64_t by, uint64_t* sum) {
    if (!sym_appears_in_tree(x, t)) return true;
    const bool is_widened = t->op == SCONV && t->left->op == NAME && is_exact_by_rule(PLUS, t->left->type);
    const NODE* name = is_widened && t->left->type->size < width ? t->left : t;
    if (!t->type->is_int() || t->type->is_bool() || t->type->size != width) return false;
    // What stands below these does not become unsigned with the sum (as_wrapping), and may have to wrap.
    const bool keeps_operand = t->op == SCONV || t->op == NOTB || t->op == SLL;
    if (keeps_operand && t->left->op != NAME && !t->left->type->is_unsigned()) return false;
    if (name->op == NAME) {
        *sum += by;
        return name->type->stqs() == x->type->stqs();
    }
    LINEAR_STEP s;
    return linear_step(t, &s) && add_coefficient(s.a, x, width, by * static_cast<uint64_t>(s.by_a), sum) &&
           (!s.b || add_coefficient(s.b, x, width, by * static_cast<uint64_t>(s.by_b), sum));
}

// But for the steps.
const std::vector<TRIPLE_WRITE>& other_writes_of(const SYMTAB* x) {
    const auto [at, is_new] = other_writes.try_emplace(x);
    if (!is_new) return at->second;
    const std::vector<TRIPLE_STEP>& steps = variable_steps.at(x);
    size_t step = 0;
    for (const TRIPLE_WRITE& w : writes_of_variable(x)) {
        const bool is_step = step < steps.size() && steps[step].block == w.block && steps[step].position == w.position;
        is_step ? void(++step) : at->second.push_back(w);
    }
    return at->second;
}

// A pointer is made a counter itself later on, with what it is computed from.
void ANNOTATOR::find_writes_of(TRIPLE& t) {
    const TRIPLE_SITES& sites = t.sites;
    const bool may_step = t.tree->type->is_int() && !t.may_trap && !t.reads_memory &&
                          std::none_of(sites.begin(), sites.end(), [](const TRIPLE_SITE& s) { return s.may_be_counter; });
    for (const SYMTAB* x : t.variables) {
        uint64_t coefficient = 0;
        auto at = variable_steps.find(x);
        if (!may_step || at == variable_steps.end() || !add_coefficient(t.tree, x, t.tree->type->size, 1, &coefficient)) {
            t.writes.push_back(&writes_of_variable(x));
            continue;
        }
        t.writes.push_back(&other_writes_of(x));
        for (const TRIPLE_STEP& s : at->second)
            t.steps.push_back({s.block, s.position, s.cell, s.amount * coefficient});
    }
    std::sort(t.steps.begin(), t.steps.end(), [](const TRIPLE_STEP& a, const TRIPLE_STEP& b) {
        return a.block != b.block ? a.block < b.block : a.position < b.position;
    });
}

TRIPLE ANNOTATOR::new_triple(int number) {
    const ENTRY& e = entries[static_cast<size_t>(number)];
    TRIPLE t;
    t.sites = {all_sites.data() + e.begin, all_sites.data() + e.end};
    t.tree = *t.sites.front().slot;
    t.cost = e.cost;
    t.may_trap = may_trap(t.tree);
    for_each_subtree(static_cast<const NODE*>(t.tree), [&t](const NODE* n) {
        if (op_is_indirection(n->op)) t.reads_memory = true;
        if (n->op == CALL && !pure_callee(n)) t.reads_memory = t.is_asked_whole = true;
        if (n->op != NAME || !n->u.sym || n->u.sym->is_function()) return;
        if (!only_its_name_reaches(n->u.sym)) // an address of it costs nothing to ask about
            t.reads_memory = true;
        else if (std::find(t.variables.begin(), t.variables.end(), n->u.sym) == t.variables.end())
            t.variables.push_back(n->u.sym);
    });
    find_writes_of(t);
    if (t.reads_memory) find_lvalues_of(t);
    return t;
}

void ANNOTATOR::read(NODE*& slot, bool is_certain) {
    NODE* t = slot;
    if (!t || number_of_operands[t->op] == 0) return;
    if (good_CSE_tree(t, false) && type_code(t->type) && !mixed.is_out(t)) {
        const KNOWN k = number(t);
        if (k.number != NO_TRIPLE && k.cost > 0)
            sites.push_back({k.number,
                             static_cast<float>(k.cost),
                             {block->dfn, position, &slot, block, cell, is_certain && !mixed.must_stay(t),
                              pointers_around > 0}});
    }
    pointers_around += t->type->is_pointer();
    read_operands(t, is_certain);
    pointers_around -= t->type->is_pointer();
}

// All that a variable is assigned may make that a counter.
void ANNOTATOR::read_value(NODE* assignment) {
    const size_t first = sites.size();
    read(assignment->right, true);
    if (is_private_name(assignment->left) && sites.size() > first && sites[first].place.slot == &assignment->right)
        sites[first].place.may_be_counter = true;
}

// x op= constant, or x = x op constant.
bool adds_constant(const NODE* t, uint64_t* amount) {
    if ((!is_operator_assignment(t) && t->op != ASG) || !t->right) return false;
    if (!is_private_name(t->left) || !t->left->type->is_int()) return false;
    const SYMTAB* x = t->left->u.sym;
    const bool is_plain = t->op == ASG;
    const NODE *sum = is_plain ? t->right : t, *by = sum->right;
    const int op = is_plain ? sum->op : op_of_opASG[t->op];
    if ((op != PLUS && op != MINUS) || !by || by->op != ICON) return false;
    if (sum->left->op != NAME || sum->left->u.sym != x || sum->type->stqs() != t->left->type->stqs()) return false;
    *amount = op == PLUS ? by->u.lval.value : -by->u.lval.value;
    return true;
}

void ANNOTATOR::statement(BBLK* bb, LIST* s, int at) {
    block = bb;
    cell = s;
    position = at;
    known.clear();
    NODE* t = s->first;
    enter_writes(bb, t, at);
    if (uint64_t amount = 0; adds_constant(t, &amount)) variable_steps[t->left->u.sym].push_back({bb->dfn, at, s, amount});
    if (!reads_come_first(t)) {
        if (mixed.enter(t)) for_each_read_of_mixed(t, reader());
        return mixed.clear();
    }
    switch (t->op) {
    case RETURN: return read(t->right, true);
    case IF: // its own compare stays what the control flow is read from
    case SWITCH: return read_operands(t->left, true);
    case CALL: return read_operands(t, true);
    default:
        if ((t->right->op == CALL && !is_computing_call(t->right)) || t->op == STASG)
            read_operands(t->right, true);
        else
            read_value(t);
        if (assigns_variable(t)) {
            const KNOWN value = number(t->right);
            if (value.number != NO_TRIPLE)
                assignments[t->left->u.sym].push_back({{bb->dfn, at, s, bb, 0}, value.number, value.cost});
        }
        read_place(t->left, true);
    }
}

} // namespace

// ---- Aliases

size_t Triple_Alias_Table::number_of(int tree_number, const NODE* lvalue) {
    if (rows.empty() && print_debug >= 3) debug_printf(" Building triples_alias_table\n");
    size_t& row = numbers[tree_number];
    if (!row) {
        rows.push_back({lvalue, BITVEC(), BITVEC()});
        row = rows.size();
    }
    return row - 1;
}

bool Triple_Alias_Table::may_be_altered(size_t lvalue, size_t write) {
    ROW& row = rows[lvalue];
    const auto bit = static_cast<uint32_t>(write);
    if (row.asked.test(bit)) return row.altered.test(bit);
    if (!row.asked.bits) row.asked = row.altered = BITVEC(static_cast<uint32_t>(memory_writes.size()));
    row.asked.set(bit);
    const NODE* statement = memory_writes[write].statement;
    const bool may = tree_modifies_lvalue(statement, row.lvalue);
    if (may) row.altered.set(bit);
    if (print_debug >= 3) {
        const std::string text = tree_to_infix(row.lvalue);
        debug_printf(" --- alias test: %s and", stmt2infix(statement).c_str());
        debug_printf(" to %s ", text.c_str());
        debug_printf(may ? " MAY be aliased\n" : " NOT aliased\n");
        // (1): it is stored to by the statement itself; (2): by what that calls.
        if (may) debug_printf(statement->op == ASG ? " +++ alias test (1): add %s \n" : " +++ alias test (2): add %s \n", text.c_str());
    }
    return may;
}

void Triple_Alias_Table::forget_answers() {
    for (ROW& row : rows) row.asked = row.altered = BITVEC();
}

void Triple_Alias_Table::clear() {
    numbers.clear();
    std::vector<ROW>().swap(rows);
}

const std::vector<TRIPLE_WRITE>& writes_of_variable(const SYMTAB* sym) {
    static const std::vector<TRIPLE_WRITE> none;
    auto at = variable_writes.find(sym);
    return at == variable_writes.end() ? none : at->second;
}
const std::vector<TRIPLE_WRITE>& writes_of_memory() { return memory_writes; }
const std::vector<TRIPLE_WRITE>& statements_that_may_stay() { return staying; }

bool write_may_alter(const TRIPLE& t, const TRIPLE_WRITE& w) {
    const auto write = static_cast<size_t>(&w - memory_writes.data());
    return std::any_of(t.lvalues.begin(), t.lvalues.end(),
                       [write](size_t lvalue) { return triples_alias_table.may_be_altered(lvalue, write); }) ||
           (t.is_asked_whole && tree_modifies_lvalue_in_tree(w.statement, t.tree));
}

// ---- Dumps

// Adds the triples that a statement of the block may alter.
static void mark_altered_triples(const BBLK* bb, BITVEC* set) {
    auto is_of_block = [bb](const TRIPLE_WRITE& w) { return w.block == bb->dfn; };
    for (size_t i = 0; i < unique_triples.size(); ++i) {
        const TRIPLE& t = unique_triples[i];
        bool is_altered = false;
        for (const std::vector<TRIPLE_WRITE>* writes : t.writes)
            is_altered |= std::any_of(writes->begin(), writes->end(), is_of_block);
        for (const TRIPLE_WRITE& w : memory_writes)
            if (!is_altered && is_of_block(w)) is_altered = write_may_alter(t, w);
        if (is_altered) {
            debug_printf(" Altered! %ld\n", static_cast<long>(i));
            set->set(static_cast<uint32_t>(i));
        } else {
            debug_printf(" NOT marked (not altered)\n");
        }
    }
}

// What a write of memory ends.
static void dump_killed(size_t write) {
    std::vector<uint32_t> killed;
    for (uint32_t i = 0; i < unique_triples.size(); ++i)
        if (unique_triples[i].reads_memory && write_may_alter(unique_triples[i], memory_writes[write])) killed.push_back(i);
    const std::string text = stmt2infix(memory_writes[write].statement);
    debug_printf(killed.empty() ? "          Nothing to kill for %s [%ld]\n" : "     Kill aliases of %s [%ld]:\n", text.c_str(),
                 static_cast<long>(write));
    for (uint32_t i : killed) {
        const NODE* t = unique_triples[i].tree;
        debug_printf("          --- %s [%u] %s\n", opname(t->op), i, tree_to_infix(t).c_str());
    }
}

static void dump_altered() {
    for (size_t i = 0; i < memory_writes.size(); ++i) dump_killed(i);
    for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink) {
        BITVEC altered(static_cast<uint32_t>(unique_triples.size()));
        mark_altered_triples(bb, &altered);
        debug_printf(" ALTERED SET bb(%d):\n", bb->dfn);
        for (uint32_t i = altered.next_set(0); i < altered.bits; i = altered.next_set(i + 1))
            debug_printf("   ALTERED:\t%s\n", tree_to_infix(unique_triples[i].tree).c_str());
    }
}

void annotate_cfg() {
    if (print_debug) debug_printf("\n\n\t\t\t---------- ENTERING 'annotate_cfg' ----------\n");
    clean_up_gdflow_bitvecs();
    need(fact::alias | fact::block_numbers | fact::points_to);
    ANNOTATOR().run();
    if (!print_debug) return;
    for (size_t i = 0; i < unique_triples.size(); ++i) {
        const std::string text = tree_to_infix(unique_triples[i].tree);
        debug_printf("\tTriple <%d>:\t----    %s\n", static_cast<int>(i), text.c_str());
        if (print_debug >= 3)
            debug_printf("\tBucket[%d] holds triple <%ld>:\t%s\n", unique_triples[i].tree->op, static_cast<long>(i), text.c_str());
    }
    if (print_debug < 3) return;
    dump_altered();
    triples_alias_table.forget_answers(); // what a dump asks is asked again, and counts for the limit then
}

void clean_up_gdflow_bitvecs() {
    std::vector<TRIPLE>().swap(unique_triples);
    std::vector<TRIPLE_SITE>().swap(all_sites);
    unique_triple_count = triple_site_count = 0;
    triples_alias_table.clear();
    variable_writes.clear();
    variable_steps.clear();
    other_writes.clear();
    std::vector<TRIPLE_WRITE>().swap(memory_writes);
    std::vector<TRIPLE_WRITE>().swap(staying);
}

void clean_up_assert_RELOPs() {}
