// Reading addresses as sums of counts of iterations and of invariants. For dependence analysis alone.
#pragma once

#include "OPT5/dd/reference_form.h"

#include "OPT5/alias/effects.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/exact.h"
#include "OPT5/simp/simp.h"

#include <algorithm>
#include <map>
#include <optional>
#include <unordered_map>

constexpr int MOST_NODES = 96, MOST_DEPTH = 24, MOST_KNOWN = 32;

inline bool is_plain_integer(const TYPE* t) { return t->is_int() && !t->is_bool() && t->size <= 64; }
inline bool same_integers(const TYPE* a, const TYPE* b) {
    return is_plain_integer(a) && is_plain_integer(b) && a->size == b->size && a->is_unsigned() == b->is_unsigned();
}
inline bool same_numbers(const TYPE* a, const TYPE* b) {
    return same_integers(a, b) || (a->is_pointer() && b->is_pointer() && a->size == b->size);
}

// ---- What is known at a point of the walk over a block

struct ASSIGNED {
    const SYMTAB* sym;
    const NODE* value; // a part of the statement
};

struct POINT {
    struct LOOP* loop = nullptr; // of the block
    std::vector<ASSIGNED> known;
    // By how much the block's loop has moved its induction variables in this iteration; nothing: by no constant.
    std::map<const SYMTAB*, std::optional<WIDE>, BY_UID> moved;

    const NODE* value_of(const SYMTAB* sym) const {
        for (const ASSIGNED& a : known)
            if (a.sym == sym) return a.value;
        return nullptr;
    }
    void forget(const SYMTAB* sym) {
        known.erase(
            std::remove_if(known.begin(), known.end(),
                           [sym](const ASSIGNED& a) { return a.sym == sym || sym_appears_in_tree(sym, a.value); }),
            known.end());
    }
    void forget_written(const NODE* tree, bool below_root) {
        for_each_written_name(tree, [&](const NODE* name, const NODE* by) {
            if (!below_root || by != tree) forget(name->u.sym);
        });
    }
};

// Computed from variables that only their names reach, and without effects.
inline bool is_computed_from_variables(const NODE* t) {
    return !any_subtree(t, [](const NODE* n) {
        if (n->op == NAME) return !only_its_name_reaches(n->u.sym);
        return op_has_effect(n->op) || op_is_call(n->op) || op_is_intrinsic(n->op) || n->op == UMULT ||
               n->op == STREF || n->op == STDOT || n->op == UAND;
    });
}
inline bool is_readable(const NODE* t) {
    return t->op == ICON || (t->op == UAND && t->left->op == NAME) || is_computed_from_variables(t) ||
           ((t->op == PLUS || t->op == MINUS) && is_readable(t->left) && is_readable(t->right)) ||
           ((t->op == PCONV || t->op == ISP2CHAR) && is_readable(t->left));
}

// ---- The values that loops are entered with

class ENTRY_VALUES {
public:
    NODE* make(const SYMTAB* sym, struct LOOP* loop) {
        const auto [it, is_new] = numbers.try_emplace({sym, loop->uid}, FIRST + loops.size());
        if (is_new) loops.push_back(loop);
        NODE* t = new_node(MIXVALUE, sym->type->stqs());
        t->u.rval = reinterpret_cast<void*>(it->second);
        return t;
    }
    struct LOOP* loop_of(const NODE* mix) const {
        return loops[reinterpret_cast<uintptr_t>(mix->u.rval) - FIRST];
    }

private:
    static constexpr uintptr_t FIRST = 2;
    std::map<std::pair<const SYMTAB*, int>, uintptr_t> numbers; // looked up alone
    std::vector<struct LOOP*> loops;
};

// ---- What loops keep

class KEPT_VALUES {
public:
    struct LOOP* loop_counted_by(const SYMTAB* sym) const {
        const auto it = counted.find(sym);
        return it == counted.end() ? nullptr : it->second;
    }
    void enter(struct LOOP* loop) {
        if (loop->VLCV) counted[loop->VLCV->sym] = loop;
    }
    // The outermost loop around that keeps the variable, or what memory holds; null: not even `loop` does.
    struct LOOP* keeps_variable(const SYMTAB* sym, struct LOOP* loop) {
        if (!sym || !(sym->sclass == SC_PARM || only_its_name_reaches(sym))) return nullptr;
        struct LOOP* outermost = nullptr;
        for (; loop && sym_is_RC_in_loop(sym, loop); loop = loop->parent) outermost = loop;
        return outermost;
    }
    // What the variable holds ahead of the loop, or null; owned here or by the loop's record.
    const NODE* value_ahead(const SYMTAB* sym, struct LOOP* loop) {
        if (auto it = loop->record_of.find(sym); it != loop->record_of.end() && it->second->has(IV_is_RC))
            return it->second->init;
        const auto [it, is_new] = ahead.try_emplace({sym, loop}, nullptr);
        constexpr int BUDGET = 1000, DEPTH = 10;
        if (is_new && loop->preheader)
            it->second = find_symbol_value(const_cast<SYMTAB*>(sym), loop->preheader, loop, BUDGET, DEPTH);
        return it->second;
    }
    struct LOOP* keeps_memory(const NODE* read, struct LOOP* loop) {
        struct LOOP* outermost = nullptr;
        for (; loop && !changes(loop, read); loop = loop->parent) outermost = loop;
        return outermost;
    }

private:
    struct ANSWER {
        NODE* read;
        bool is_changed;
    };
    bool changes(struct LOOP* loop, const NODE* read) {
        std::vector<ANSWER>& answers = asked[loop];
        for (const ANSWER& a : answers)
            if (trees_are_congruent(a.read, read, false)) return a.is_changed;
        constexpr size_t MOST_ANSWERS = 32;
        if (answers.size() >= MOST_ANSWERS) return true;
        answers.push_back({copy_tree(read), writes(loop, read)});
        return answers.back().is_changed;
    }
    bool writes(struct LOOP* loop, const NODE* read) {
        for (BBLK* bb : loop->contents)
            if (bb->loop == loop ? bb_modifies_lvalue_in_tree(bb, read) : changes(bb->loop, read)) return true;
        return false;
    }

    std::unordered_map<const SYMTAB*, struct LOOP*> counted;             // looked up alone
    std::unordered_map<const struct LOOP*, std::vector<ANSWER>> asked;   // looked up alone
    std::map<std::pair<const SYMTAB*, const struct LOOP*>, NODE*> ahead; // looked up alone

public:
    ~KEPT_VALUES() {
        for (auto& [loop, answers] : asked)
            for (ANSWER& a : answers) erase_tree(a.read);
        for (auto& [key, value] : ahead) erase_tree(value);
    }
};

// ---- Variables that a loop and the loop around it move

// By how much one iteration of the loop around moves the variable, and how much of it comes ahead of the loop within.
struct NEST_STEP {
    bool is_known = false;
    WIDE total = 0, before = 0;
};

inline NEST_STEP step_over_nest(const SYMTAB* sym, struct LOOP* inner);

// What all iterations of the loop add, if that is a constant.
inline std::optional<WIDE> moved_by_loop(const SYMTAB* sym, struct LOOP* loop) {
    if (!loop->trips || loop->trips->op != ICON || !loop->is_bottom_tested() || loop->has(LOOP_early_exit))
        return std::nullopt;
    const WIDE trips = to_wide(loop->trips->u.lval);
    if (const LOOPIV* iv = find_LOOPIV_for_IV(sym, loop, false)) {
        if (!iv->has(IV_affine) || !iv->incrtree || iv->incrtree->op != ICON) return std::nullopt;
        return to_wide(sign_extend_by_type_size(iv->incrtree->u.lval, iv->incrtree->type)) * trips;
    }
    for (BBLK* bb : loop->contents)
        if (bb->loop != loop && !sym_is_RC_in_loop(sym, bb->loop)) {
            const NEST_STEP step = step_over_nest(sym, bb->loop);
            return step.is_known ? std::optional<WIDE>(step.total * trips) : std::nullopt;
        }
    return std::nullopt;
}

inline std::optional<WIDE> amount_of(const INDUCTION_UPDATE& u);

// Each iteration of the loop around `inner` must execute every update: those of `inner`, and those of its own head and
// tail.
inline NEST_STEP step_over_nest(const SYMTAB* sym, struct LOOP* inner) {
    struct LOOP* around = inner->parent;
    const bool is_exact = sym->type->is_pointer() || (sym->type->is_int() && sym->type->is_signed());
    const auto by_inner = moved_by_loop(sym, inner);
    if (!is_exact || !by_inner || !around->VLCV || !only_its_name_reaches(sym) || !around->tail ||
        !bb_dominates_bb(inner->head, around->tail))
        return {};
    NEST_STEP step{true, *by_inner, 0};
    for (BBLK* bb : around->contents) {
        if (bb->loop == inner) continue;
        if (bb->loop != around) {
            if (!sym_is_RC_in_loop(sym, bb->loop)) return {};
            continue;
        }
        for (const LIST* s = bb->statements; s; s = s->rest) {
            bool is_written = false;
            for_each_written_name(s->first, [&](const NODE* name, const NODE*) { is_written |= name->u.sym == sym; });
            if (!is_written) continue;
            INDUCTION_UPDATE u;
            const bool is_update = is_induction_update(s->first, &u) && u.sym == sym && !u.is_narrowed;
            const auto amount = is_update ? amount_of(u) : std::nullopt;
            if (!amount || (bb != around->head && bb != around->tail)) return {};
            step.total += *amount;
            if (bb == around->head) step.before += *amount;
        }
    }
    return step;
}

// ---- The sum

// Reads the address of one reference.
class ADDRESS_READER final : public LINEAR_READER {
public:
    ADDRESS_READER(REFERENCE* r, const POINT& p, KEPT_VALUES& k, ENTRY_VALUES& e)
        : LINEAR_READER(&r->sum, MOST_NODES), made(*r), point(p), kept(k), entries(e), loop(p.loop) {}
    // Of an integer that is part of what `outer` reads, modulo its own width.
    ADDRESS_READER(const ADDRESS_READER& outer, LINEAR_FORM* f, const TYPE* type)
        : LINEAR_READER(f, MOST_NODES), made(outer.made), point(outer.point), kept(outer.kept), entries(outer.entries),
          loop(outer.loop), entered(outer.entered), depth(outer.depth + 1), wrapping(type) {}

    // Adds a multiple of a number that a condition speaks of, at the point or, `ahead`, ahead of its loop; false if a part
    // of it was refused. In it addresses may be subtracted from each other: `subtracts_addresses`.
    bool add_number(const NODE* t, int64_t k, bool ahead) {
        reads_condition = true;
        return ahead ? at_entry(point.loop, [&] { return read(t, k); }) : read(t, k);
    }
    void find_facts() {
        made.facts.clear();
        for (const LINEAR_FORM::TERM& t : made.sum) made.facts.push_back(facts_of(t.tree));
    }
    bool subtracts_addresses = false;
    // Whether the sum is the number that is read, of that type: one that may have wrapped, and lies in the type all the
    // same, is.
    bool is_number_of(const TYPE* type) {
        if (!made.sum.is_exact && type->size == ADDRESS_BITS && has_value_range(type) && lies_in_type(&made.sum, type))
            made.sum.is_exact = true;
        return made.sum.is_exact;
    }

    // The greatest value of a tree that is read ahead of the loop of the point, or NO_LAST.
    WIDE greatest_ahead(const NODE* t) {
        const bool is_read = at_entry(point.loop, [&] { return read(t, 1); });
        if (!is_read || (!form.is_exact && t->type->size != ADDRESS_BITS)) return NO_LAST;
        WIDE low = form.constant, high = form.constant;
        const WIDE limit = WIDE(1) << (ADDRESS_BITS - 1);
        return add_bounds(form, &low, &high) && low >= -limit && high < limit ? high : NO_LAST;
    }
    void read_address(const NODE* umult) {
        LINEAR_FORM& sum = made.sum;
        if (!read(umult->left, 1) || (umult->right && !read(umult->right, 1))) {
            sum = LINEAR_FORM(ADDRESS_BITS);
            sum.add(own(copy_tree(umult->left)), 1);
            if (umult->right) sum.add(own(copy_tree(umult->right)), 1);
        }
        find_facts();
    }

private:
    // ---- Operators

    const NODE* without_marks(const NODE* t) const override {
        while (t->op == IDENTITY || t->op == OUIALIGN || t->op == NONALIGN) t = t->left;
        return t;
    }
    bool takes_constant(const NODE* icon) override { return is_plain_integer(icon->type) || icon->type->is_pointer(); }

    bool opens(const NODE* t, const LINEAR_STEP& step) override {
        if (t->type->is_pointer()) return opens_pointer(t, step);
        if (!is_plain_integer(t->type) || t->op == NOTB || t->op == ISP2CHAR) return false;
        if (t->op == SCONV || t->op == PCONV) return opens_cast(t);
        if (t->op == PMCONV) // within an object
            return is_plain_integer(t->left->type) && t->right->u.lval.value % ADDRESS_UNIT_BITS == 0;
        if (reads_condition && t->op == MINUS && step.a->type->is_pointer() && step.b->type->is_pointer() &&
            t->type->size == form.bits && form.bits == ADDRESS_BITS)
            return subtracts_addresses = true;
        if (!same_integers(step.a->type, t->type) || (step.b && !same_integers(step.b->type, t->type))) return false;
        return is_exact_by_rule(t->op, t->type) || operation_is_exact(t, loop) ||
               (wrapping && same_integers(t->type, wrapping));
    }
    static bool opens_pointer(const NODE* t, const LINEAR_STEP& step) {
        if (t->op == PCONV || t->op == ISP2CHAR)
            return t->left->type->is_pointer() && t->left->type->size == t->type->size;
        if (t->op == MINUS) return step.a->type->is_pointer() && is_plain_integer(step.b->type);
        return t->op == PLUS && step.a->type->is_pointer() != step.b->type->is_pointer();
    }
    bool opens_cast(const NODE* cast) {
        const TYPE *from = cast->left->type, *to = cast->type;
        if (from->is_pointer() && from->size == to->size && form.bits <= to->size) { // an address as a number
            form.is_exact = false;
            return true;
        }
        if (!is_plain_integer(from)) return false;
        if (from->size <= to->size &&
            (from->is_unsigned() == to->is_unsigned() || (from->is_unsigned() && from->size < to->size)))
            return true;
        if (range_of_tree(cast->left, loop).is_within(range_of_type(to))) return true;
        if (to->size < form.bits) return false;
        form.is_exact = false; // equal modulo the width of the sum
        return true;
    }

    // ---- Leaves

    bool leaf(const NODE* t, int64_t k) override {
        if (nodes_left < 0 || depth > MOST_DEPTH) return false;
        if (t->op == UAND && t->type->is_pointer()) return read_place(t->left, k);
        if (t->op == NAME && is_readable_variable(t)) return variable(t, k);
        if (is_wrapping_sum(t)) return wrapping_sum(t, k);
        if (t->op == MULT && add_product(t, k)) return true;
        if (!is_opened_inside(t)) return form.add(own(copy_tree(t)), k);
        return form.add(own(with_values(copy_tree(t))), k);
    }
    // An unsigned sum, or a shift. All of it is one sum modulo its width, and that number itself where it lies in the
    // type.
    static bool is_wrapping_sum(const NODE* t) {
        LINEAR_STEP step;
        return is_plain_integer(t->type) && (t->type->is_unsigned() || t->op == SLL) && t->op != SCONV &&
               t->op != NOTB && linear_step(t, &step) && same_integers(step.a->type, t->type) &&
               (!step.b || same_integers(step.b->type, t->type));
    }
    bool wrapping_sum(const NODE* t, int64_t k) {
        LINEAR_FORM part(static_cast<unsigned>(t->type->size));
        ADDRESS_READER reader(*this, &part, t->type->stqs());
        const bool is_read = depth < MOST_DEPTH && reader.read(t, 1);
        if (!is_read || (!lies_in_type(&part, t->type) && t->type->size < ADDRESS_BITS)) {
            return form.add(own(is_opened_inside(t) ? with_values(copy_tree(t)) : copy_tree(t)), k);
        }
        if (!lies_in_type(&part, t->type)) form.is_exact = false;
        form.add_constant(form.reduced(WIDE(k) * part.constant));
        for (const LINEAR_FORM::TERM& term : part)
            if (!form.add(term.tree, form.reduced(WIDE(k) * term.coefficient))) return false;
        return true;
    }
    // An invariant variable times a sum, as a sum of products; false, and nothing added, where it is none.
    bool add_product(const NODE* t, int64_t k) {
        if (!is_plain_integer(t->type) || depth >= MOST_DEPTH || !same_integers(t->left->type, t->type) ||
            !same_integers(t->right->type, t->type) || !(is_exact_by_rule(MULT, t->type) || operation_is_exact(t, loop)))
            return false;
        for (bool by_left : {false, true}) {
            const NODE *factor = by_left ? t->left : t->right, *rest = by_left ? t->right : t->left;
            while (factor->op == SCONV && keeps_values_of(factor)) factor = factor->left;
            LINEAR_FORM part(ADDRESS_BITS);
            if (factor->op != NAME || !is_invariant_variable(factor) || rest->op == ICON) continue;
            if (!ADDRESS_READER(*this, &part, nullptr).read(rest, 1) || !part.is_exact) continue;
            LINEAR_FORM sum = form;
            bool fits = true;
            if (part.constant) fits = form.add(own(copy_tree(factor)), form.reduced(WIDE(k) * part.constant));
            for (const LINEAR_FORM::TERM& term : part)
                fits = fits && form.add(own(product(term.tree, factor, t->type)), form.reduced(WIDE(k) * term.coefficient));
            if (fits) return true;
            form = sum;
        }
        return false;
    }
    static bool keeps_values_of(const NODE* cast) {
        return is_plain_integer(cast->type) && is_plain_integer(cast->left->type) &&
               range_of_type(cast->left->type).is_within(range_of_type(cast->type));
    }
    // Neither moved by a loop around nor set to what is known.
    bool is_invariant_variable(const NODE* name) {
        const SYMTAB* sym = name->u.sym;
        struct LOOP* in = entered ? entered : loop;
        if (!is_plain_integer(name->type) || !is_readable_variable(name) || (!entered && point.value_of(sym))) return false;
        if (const LOOPIV* iv = find_LOOPIV_for_IV(sym, in, true); iv && iv->has(IV_is_IV)) return false;
        struct LOOP* keeps = kept.keeps_variable(sym, in);
        return keeps && (keeps->is_root() || !kept.value_ahead(sym, keeps));
    }
    // Wide enough to be the product of the numbers.
    static NODE* product(const NODE* term, const NODE* factor, const TYPE* of) {
        TYPE* type = of->size <= 16 ? tp->long_t : tp->llong_t;
        NODE *a = copy_tree(term), *b = coerce_to_type(type, copy_tree(factor));
        if (a->op != NAME) a = coerce_to_type(type, a);
        return maketree(MULT, a, b, type);
    }
    // The constant of the sum may be off by a multiple of the modulus: it is the one that gives numbers of the type.
    bool lies_in_type(LINEAR_FORM* sum, const TYPE* type) {
        const RANGE all = range_of_type(type);
        const WIDE modulus = all.max - all.min + 1;
        WIDE low = 0, high = 0;
        if (!add_bounds(*sum, &low, &high)) return false;
        if (sum->bits >= 64) return sum->constant + low >= all.min && sum->constant + high <= all.max;
        for (WIDE c : {WIDE(sum->constant), sum->constant + modulus})
            if (c + low >= all.min && c + high <= all.max) {
                sum->constant = static_cast<int64_t>(c);
                return true;
            }
        return false;
    }
    bool add_bounds(const LINEAR_FORM& sum, WIDE* low, WIDE* high) {
        for (const LINEAR_FORM::TERM& t : sum) {
            const TERM_FACTS f = facts_of(t.tree);
            const WIDE first = f.counts ? 0 : f.range.min, last = f.counts ? last_iteration(f.counts) : f.range.max;
            if ((!f.counts && !f.is_bounded) || last >= NO_LAST) return false;
            *low += std::min(t.coefficient * first, t.coefficient * last);
            *high += std::max(t.coefficient * first, t.coefficient * last);
        }
        return true;
    }
    // The address of the place: of an object, or the pointer and what is added.
    bool read_place(const NODE* place, int64_t k) {
        int64_t bits = 0;
        const NODE* object = without_members(place, &bits); // no bit-field: it has no address
        if (bits % ADDRESS_UNIT_BITS || (object->op != NAME && object->op != UMULT))
            return form.add(own(maketree(UAND, copy_tree(place), nullptr, tp->mk_ptr(place->type))), k);
        form.add_constant(form.reduced(WIDE(k) * (bits / ADDRESS_UNIT_BITS)));
        if (object->op == UMULT) return read(object->left, k) && (!object->right || read(object->right, k));
        return form.add(own(maketree(UAND, mk_NAME(object->u.sym), nullptr, tp->mk_ptr(tp->void_t))), k);
    }
    bool is_readable_variable(const NODE* t) const {
        return t->u.sym && same_numbers(t->type, t->u.sym->type) && !kept.loop_counted_by(t->u.sym) &&
               (t->u.sym->sclass == SC_PARM || only_its_name_reaches(t->u.sym));
    }

    bool variable(const NODE* t, int64_t k) {
        const SYMTAB* sym = t->u.sym;
        if (entered && !sym_is_RC_in_loop(sym, entered)) return value_on_entry(sym, entered, k);
        if (const NODE* value = entered ? nullptr : point.value_of(sym))
            if (same_numbers(value->type, t->type) && is_readable(value))
                return at_depth([&] { return read(value, k); });
        if (const LOOPIV* iv = find_LOOPIV_for_IV(sym, loop, true))
            if (is_affine(iv)) return induction(iv, k);
        if (struct LOOP* keeps = kept.keeps_variable(sym, entered ? entered : loop); keeps && !keeps->is_root()) {
            const NODE* value = kept.value_ahead(sym, keeps);
            if (value && same_numbers(value->type, sym->type) && is_readable(value))
                return at_entry(keeps, [&] { return read(value, k); });
        }
        return form.add(own(copy_tree(t)), k);
    }

    // ---- Induction variables

    // What the loop has added in this iteration; nothing: that is not known.
    std::optional<WIDE> moved_by(const LOOPIV* iv) const {
        if (iv->loop == point.loop && !entered) {
            const auto it = point.moved.find(iv->sym);
            return it == point.moved.end() ? WIDE(0) : it->second;
        }
        return moved_in_head(iv); // the point is in a loop within, or ahead of one
    }
    static std::optional<WIDE> moved_in_head(const LOOPIV* iv);
    bool is_affine(const LOOPIV* iv) const {
        if (!iv->has(IV_affine) || !iv->loop->VLCV || !iv->incrtree || !moved_by(iv)) return false;
        return iv->incrtree->op == ICON ||
               (is_plain_integer(iv->incrtree->type) && is_computed_from_variables(iv->incrtree));
    }
    // The count of iterations times the step.
    bool add_steps(const LOOPIV* iv, int64_t k) {
        NODE* count = mk_NAME(iv->loop->VLCV->sym);
        if (iv->incrtree->op == ICON) return form.add(own(count), form.reduced(WIDE(k) * step_of(iv)));
        return form.add(own(maketree(MULT, count, coerce_to_type(tp->long_t, copy_tree(iv->incrtree)), tp->long_t)), k);
    }
    static int64_t step_of(const LOOPIV* iv) {
        return static_cast<int64_t>(sign_extend_by_type_size(iv->incrtree->u.lval, iv->incrtree->type).value);
    }

    bool induction(const LOOPIV* iv, int64_t k) {
        form.add_constant(form.reduced(WIDE(k) * *moved_by(iv)));
        if (!add_steps(iv, k)) return false;
        return value_on_entry(iv->sym, iv->loop, k);
    }
    bool initial_value(const LOOPIV* iv, const NODE* init, int64_t k) {
        if (init->op != ICON) return at_entry(iv->loop, [&] { return read(init, k); });
        form.is_exact = form.is_exact && is_signed_number(init, iv->sym->type);
        form.add_constant(form.reduced(WIDE(k) * number(init, iv->sym->type)));
        return true;
    }
    // What the loop is entered with. Where no record says: if the loop around moves the variable by the same amount in
    // each iteration, a sum again.
    bool value_on_entry(const SYMTAB* sym, struct LOOP* of, int64_t k) {
        const LOOPIV* iv = find_LOOPIV_for_IV(sym, of, false);
        if (const NODE* init = iv && depth <= MOST_DEPTH ? readable_init(iv) : nullptr) return initial_value(iv, init, k);
        struct LOOP* around = of->parent;
        const NEST_STEP step = around && !around->is_root() ? step_over_nest(sym, of) : NEST_STEP();
        if (!step.is_known || depth > MOST_DEPTH) return form.add(own(entry_value(sym, of)), k);
        form.add_constant(form.reduced(WIDE(k) * step.before));
        if (!form.add(own(mk_NAME(around->VLCV->sym)), form.reduced(WIDE(k) * step.total))) return false;
        const NODE* init = kept.value_ahead(sym, around);
        if (init && same_numbers(init->type, sym->type) && is_readable(init))
            return at_entry(around, [&] { return read(init, k); });
        return at_depth([&] { return value_on_entry(sym, around, k); });
    }
    static const NODE* readable_init(const LOOPIV* iv) {
        const NODE* init = iv->init;
        if (!init) return nullptr;
        if (init->op == ICON && is_plain_integer(init->type)) return init;
        return same_numbers(init->type, iv->sym->type) && is_readable(init) ? init : nullptr;
    }
    static bool is_signed_number(const NODE* icon, TYPE* type) {
        return truncate_to_type(icon->u.lval, type).fits<int64_t>();
    }
    static int64_t number(const NODE* icon, TYPE* type) {
        return static_cast<int64_t>(truncate_to_type(icon->u.lval, type).value);
    }

    // ---- Terms that are no sums

    static bool is_opened_inside(const NODE* t) {
        return any_subtree(t, [](const NODE* n) { return n->op == NAME; }) && !tree_has_side_effects(t);
    }
    // The induction variables in it by the counts of iterations, so that it can be told what it depends on.
    NODE* with_values(NODE* t) {
        if (t->op == UAND) return t;
        if (t->op == NAME) return value_in_term(t);
        if (t->left) t->left = with_values(t->left);
        if (t->right) t->right = with_values(t->right);
        return t;
    }
    NODE* value_in_term(NODE* name) {
        if (!is_readable_variable(name)) return name;
        const SYMTAB* sym = name->u.sym;
        NODE* value = nullptr;
        if (entered && !sym_is_RC_in_loop(sym, entered))
            value = entry_value(sym, entered);
        else if (const LOOPIV* iv = find_LOOPIV_for_IV(sym, loop, true);
                 iv && is_affine(iv) && iv->incrtree->op == ICON)
            value = induction_in_term(iv);
        if (!value) return name;
        value = coerce_to_type(name->type->stqs(), value);
        erase_tree(name);
        return value;
    }
    NODE* induction_in_term(const LOOPIV* iv) {
        TYPE* type = iv->sym->type->is_pointer() ? iv->sym->type->stqs() : tp->long_t;
        NODE* moved = maketree(MULT, mk_NAME(iv->loop->VLCV->sym), mk_ICON(INT65(step_of(iv)), tp->long_t), tp->long_t);
        moved = maketree(PLUS, moved, mk_ICON(to_int65(*moved_by(iv)), tp->long_t), tp->long_t);
        NODE* start = iv->init && iv->init->op == ICON && !iv->sym->type->is_pointer()
                          ? mk_ICON(INT65(number(iv->init, iv->sym->type)), tp->long_t)
                          : coerce_to_type(type, entry_value(iv->sym, iv->loop));
        return maketree(PLUS, start, moved, type);
    }

    NODE* entry_value(const SYMTAB* sym, struct LOOP* of) { return entries.make(sym, of); }
    NODE* own(NODE* t) {
        made.made.push_back(t);
        return t;
    }

    // ---- Where a value is read

    template <class F>
    bool at_depth(const F& work) {
        ++depth;
        const bool done = work();
        --depth;
        return done;
    }
    // Ahead of the loop, in terms of what that keeps.
    template <class F>
    bool at_entry(struct LOOP* of, const F& work) {
        struct LOOP *outer_entered = entered, *outer_loop = loop;
        entered = of;
        loop = of->parent;
        const bool done = at_depth(work);
        entered = outer_entered;
        loop = outer_loop;
        return done;
    }

    // ---- What is known of a term

    TERM_FACTS facts_of(const NODE* t) {
        TERM_FACTS f;
        if (t->op == NAME && (f.counts = kept.loop_counted_by(t->u.sym))) return f;
        f.fixed_in = point.loop;
        while (f.fixed_in->parent) f.fixed_in = f.fixed_in->parent;
        restrict_by(t, &f);
        if (is_plain_integer(t->type)) {
            f.range = range_of_tree(t, point.loop); // what was read ahead of a loop has the same value in it
            f.is_bounded = true;
        }
        find_modulus(t, &f);
        return f;
    }
    // By the alignment of an object, or by what is known in the loops around.
    void find_modulus(const NODE* t, TERM_FACTS* f) const {
        if (t->op == UAND) {
            const SYMTAB* s = t->left->op == NAME ? t->left->u.sym : nullptr;
            if (!s || s->lives_in_others || s->hosts_others) return;
            f->modulus = std::max<int64_t>(s->align, s->type->align) / ADDRESS_UNIT_BITS;
            if (f->modulus < 2) f->modulus = 0;
            return;
        }
        for (struct LOOP* l = point.loop; l; l = l->parent)
            for (const GIVEN& g : givens_for_references(l)) {
                const LINEAR_FORM& sum = g.sum->sum;
                if (g.modulus <= f->modulus || sum.term_count() != 1 || sum.begin()->coefficient != 1 ||
                    !sum.find(t))
                    continue;
                f->modulus = g.modulus;
                f->residue = ((g.residue - sum.constant) % g.modulus + g.modulus) % g.modulus;
            }
    }
    void restrict_by(const NODE* t, TERM_FACTS* f) {
        for (; t && f->fixed_in; t = t->left) {
            if (t->op == NAME) {
                if (struct LOOP* counted = kept.loop_counted_by(t->u.sym))
                    f->levels |= counted->level < MOST_LEVELS ? level_bit(counted->level) : no_level(f);
                else
                    restrict_to(kept.keeps_variable(t->u.sym, point.loop), f);
                return;
            }
            if (t->op == MIXVALUE) return restrict_to(entries.loop_of(t), f);
            if (t->op == UAND && name_of_place(t->left)) return;
            if (op_has_effect(t->op) || op_is_call(t->op) || t->op == STDOT || t->op == STREF)
                return restrict_to(nullptr, f);
            if (t->op == UMULT) {
                const bool can_be_asked = !lvalue_is_volatile(t) && !any_subtree(t, [this](const NODE* n) {
                    return n->op == MIXVALUE || (n->op == NAME && kept.loop_counted_by(n->u.sym));
                });
                restrict_to(can_be_asked ? kept.keeps_memory(t, point.loop) : nullptr, f);
            }
            restrict_by(t->right, f);
        }
    }
    static uint64_t no_level(TERM_FACTS* f) {
        f->fixed_in = nullptr;
        return 0;
    }
    static void restrict_to(struct LOOP* to, TERM_FACTS* f) {
        if (!f->fixed_in || !to)
            f->fixed_in = nullptr;
        else if (to->level > f->fixed_in->level)
            f->fixed_in = to;
    }

    REFERENCE& made;
    const POINT& point;
    KEPT_VALUES& kept;
    ENTRY_VALUES& entries;
    struct LOOP* loop;              // that the tree being read stands in
    struct LOOP* entered = nullptr; // it is read ahead of this one; null: at the point
    int depth = 0;
    bool reads_condition = false;
    const TYPE* wrapping = nullptr; // operators of this unsigned type are opened whatever they give
};

// The signed number that an update adds, or nothing.
inline std::optional<WIDE> amount_of(const INDUCTION_UPDATE& u) {
    if (u.amount->op != ICON) return std::nullopt;
    INT65 v = u.amount->u.lval;
    if (!u.sym->type->is_pointer() && u.sym->type->is_unsigned()) v = sign_extend_by_type_size(v, u.sym->type);
    return u.is_subtracted ? -to_wide(v) : to_wide(v);
}

// Enters a statement that moves an induction variable of its loop.
inline void enter_update(const NODE* statement, POINT* p) {
    INDUCTION_UPDATE u;
    if (!is_induction_update(statement, &u) || !find_LOOPIV_for_IV(u.sym, p->loop, false)) return;
    std::optional<WIDE>& moved = p->moved.try_emplace(u.sym, WIDE(0)).first->second;
    const auto amount = amount_of(u);
    moved = moved && amount ? std::optional<WIDE>(*moved + *amount) : std::nullopt;
}

inline void enter_updates_of_head(POINT* p) {
    for (const LIST* s = p->loop->head->statements; s; s = s->rest) enter_update(s->first, p);
}

inline std::optional<WIDE> ADDRESS_READER::moved_in_head(const LOOPIV* iv) {
    POINT p;
    p.loop = iv->loop;
    enter_updates_of_head(&p);
    const auto it = p.moved.find(iv->sym);
    return it == p.moved.end() ? WIDE(0) : it->second;
}
