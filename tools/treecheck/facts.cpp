// What is known of a tree against the values that it has.

#include "tools/treecheck/checker.h"

#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/simp/known_bits.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

namespace treecheck {

namespace {

using WIDE = __int128;

WIDE wide(BITS v, const FORM& f) {
    return f.is_signed ? static_cast<WIDE>(static_cast<int64_t>(v)) : static_cast<WIDE>(v);
}
WIDE wide(INT65 v) { return static_cast<WIDE>(v.value) - (v.is_negative() ? WIDE(1) << 64 : 0); }
INT65 narrow(WIDE v) { return INT65(v < 0 ? -1 : 0, static_cast<uint64_t>(v)); }
bool is_power_of_2(WIDE v) { return v > 0 && (v & (v - 1)) == 0; }
bool is_integer(const FORM& f) { return f.bits && !f.is_float && !f.is_pointer; }

} // namespace

// Each check puts a text into `wrong` where an answer contradicts a run.
class FACTS {
public:
    explicit FACTS(const TRIAL& t)
        : trial(t), tree(t.tree), form(t.form), loop(t.around ? t.around->loop() : nullptr) {}

    FINDING run() {
        FINDING f;
        if (trial.runs.empty() || !is_integer(form)) return f;
        check_bits();
        check_bounds();
        check_signs();
        check_values();
        check_factors();
        check_residues();
        check_coefficients();
        if (!tree_has_side_effects(tree)) {
            check_operands();
            check_partial_evaluation();
            check_range_simplifier();
        }
        if (wrong.empty()) return f;
        f.what = wrong;
        f.before = tree_to_infix(tree);
        f.contents = trial.contents(wrong_run ? wrong_run->assignment : 0) + (trial.around ? trial.around->text() : "");
        return f;
    }

private:
    using RUN = TRIAL::RUN;

    WIDE value(const RUN& r) const { return wide(r.value, form); }

    template <class HOLDS>
    void expect(const char* question, HOLDS&& holds) {
        for (const RUN& r : trial.runs) {
            if (!wrong.empty()) return;
            if (holds(r)) continue;
            wrong = std::string(question) + ": value " + value_text(r.value, form);
            wrong_run = &r;
        }
    }

    void check_bits() {
        const KNOWN_BITS k = known_bits(tree);
        const uint64_t mask = type_mask(tree->type).value;
        expect("known_bits", [&](const RUN& r) {
            const uint64_t bits = r.value & mask;
            return !(bits & k.zeros) && !(~bits & k.ones);
        });
    }

    void check_bounds() {
        const WIDE min = wide(calculate_minval_for_tree(tree, loop)), max = wide(calculate_maxval_for_tree(tree, loop));
        expect("calculate_minval_for_tree", [&](const RUN& r) { return value(r) >= min; });
        expect("calculate_maxval_for_tree", [&](const RUN& r) { return value(r) <= max; });
    }

    void check_signs() {
        if (tree_is_non_negative(tree, loop))
            expect("tree_is_non_negative", [&](const RUN& r) { return value(r) >= 0; });
        if (tree_is_negative(tree, loop)) expect("tree_is_negative", [&](const RUN& r) { return value(r) < 0; });
        if (tree_is_positive(tree, loop)) expect("tree_is_positive", [&](const RUN& r) { return value(r) > 0; });
        if (tree_is_zero(tree, loop)) expect("tree_is_zero", [&](const RUN& r) { return value(r) == 0; });
        if (tree_is_non_zero(tree, loop)) expect("tree_is_non_zero", [&](const RUN& r) { return value(r) != 0; });
        if (positive_tree_is_power_of_2(tree, loop))
            expect("positive_tree_is_power_of_2",
                   [&](const RUN& r) { return value(r) <= 0 || is_power_of_2(value(r)); });
    }

    void check_values() {
        const INT65 first = narrow(value(trial.runs.front()));
        if (tree_is_ivalue(tree, first, loop))
            expect("tree_is_ivalue", [&](const RUN& r) { return value(r) == wide(first); });
        if (tree_is_ivalue(tree, first + INT65(1), loop)) expect("tree_is_ivalue", [](const RUN&) { return false; });
        expect("tree_is_not_ivalue", [&](const RUN& r) { return !tree_is_not_ivalue(tree, narrow(value(r)), loop); });
    }

    void check_factors() {
        const WIDE f = wide(max_ICON_factor(tree, loop)), relaxed = wide(max_ICON_factor(tree, loop, true));
        const WIDE asserted = wide(max_asserted_ICON_factor(tree, loop)), delta = wide(max_ICON_delta(tree, nullptr));
        expect("max_ICON_factor", [&](const RUN& r) { return f >= 1 && value(r) % f == 0; });
        expect("max_asserted_ICON_factor", [&](const RUN& r) { return asserted >= 1 && value(r) % asserted == 0; });
        expect("max_ICON_factor, exact",
               [&](const RUN& r) { return relaxed >= 1 && (r.overflowed || value(r) % relaxed == 0); });
        expect("max_ICON_delta",
               [&](const RUN& r) { return delta >= 1 && (value(r) - value(trial.runs.front())) % delta == 0; });
        static TYPE* const types[] = {tp->int_t, tp->uint_t, tp->long_t, tp->ullong_t};
        for (TYPE* t : types)
            for (int c : {2, 3, 6, 16, -5}) {
                if (!constant_divides_expr(INT65(c), t, tree, loop)) continue;
                expect("constant_divides_expr",
                       [&](const RUN& r) { return wide(truncate_to_type(narrow(value(r)), t)) % c == 0; });
            }
    }

    void check_residues() {
        static TYPE* const types[] = {tp->int_t, tp->uint_t, tp->llong_t};
        for (TYPE* t : types)
            for (int m : {1, 2, 3, 4, 7, 12, 32}) {
                const WIDE residue = wide(expr_modulo_constant(tree, t, INT65(m), loop));
                if (residue < 0) continue;
                expect("expr_modulo_constant", [&](const RUN& r) {
                    const WIDE v = wide(truncate_to_type(narrow(value(r)), t));
                    return (v % m + m) % m == residue;
                });
            }
    }

    // The quotient of the tree times the coefficient is the tree again.
    void check_coefficients() {
        const INT65 c = max_ICON_coef(tree);
        if (c <= INT65(1)) return;
        NODE* quotient = div_ICON_coef(copy_tree(tree), c);
        expect_result("div_ICON_coef", quotient, [&](const RUN& r, BITS v, bool undefined) {
            return !undefined && (static_cast<uint64_t>(wide(v, form) * wide(c)) & type_mask(tree->type).value) ==
                                     (r.value & type_mask(tree->type).value);
        });
    }

    // Runs `result`, which is erased, from the same contents as the tree.
    template <class HOLDS>
    void expect_result(const char* question, NODE* result, HOLDS&& holds) {
        const bool was_right = wrong.empty();
        EVALUATOR e;
        e.null_is_passed = true;
        expect(question, [&](const RUN& r) {
            trial.begin(&e, r.assignment);
            const BITS v = e.eval(result);
            return holds(r, v, e.undefined || (e.overflowed && !r.overflowed));
        });
        if (was_right && !wrong.empty()) wrong += ", answer " + tree_to_infix(result);
        erase_tree(result);
    }

    // Questions about two trees, asked of the operands of the tree.
    void check_operands() {
        const NODE *a = tree->left, *b = tree->right;
        if (!a || !b || tree->op == QUEST || tree->op == COMMAOP || op_is_call(tree->op)) return;
        const FORM fa = form_of(a->type), fb = form_of(b->type);
        if (!is_integer(fa) || !is_integer(fb)) return;
        EVALUATOR e;
        bool first = true;
        const bool differ = tree_values_are_not_equal(a, b, loop), cannot_divide = expr_cannot_divide_expr(a, b, loop);
        const bool is_exact = tree->op == MULT && !expr_product_may_overflow(tree, loop);
        const bool divides = integer_DIV_is_exact(tree, loop);
        bool has_difference = false;
        WIDE difference = 0;
        const uint64_t mask = type_mask(a->type).value;
        auto operands = [&](const RUN& r, WIDE* x, WIDE* y) {
            trial.begin(&e, r.assignment);
            *x = wide(e.eval(a), fa);
            *y = wide(e.eval(b), fb);
            if (e.undefined) return false;
            if (first && fa.bits == fb.bits) {
                difference = *x - *y;
                has_difference = tree_difference_is_ivalue(a, b, narrow(difference), loop);
                first = false;
            }
            return true;
        };
        auto check = [&](const char* question, bool applies, auto&& holds) {
            if (!applies) return;
            expect(question, [&](const RUN& r) {
                WIDE x, y;
                return !operands(r, &x, &y) || holds(x, y);
            });
        };
        check("tree_values_are_not_equal", differ, [](WIDE x, WIDE y) { return x != y; });
        check("expr_cannot_divide_expr", cannot_divide,
              [](WIDE x, WIDE y) { return y != 0 && (x == 0 || y % x != 0); });
        check("expr_product_may_overflow", is_exact, [&](WIDE x, WIDE y) {
            return x * y >= wide(int_type_min(tree->type)) && x * y <= wide(int_type_max(tree->type));
        });
        check("integer_DIV_is_exact", divides, [](WIDE x, WIDE y) { return y != 0 && x % y == 0; });
        check("tree_difference_is_ivalue", true, [&](WIDE x, WIDE y) {
            return !has_difference || ((static_cast<uint64_t>(x - y) ^ static_cast<uint64_t>(difference)) & mask) == 0;
        });
    }

    void check_partial_evaluation() {
        for (bool bounded : {false, true}) {
            if (NODE* most = partially_eval_for_maximum(tree, loop, bounded))
                expect_result("partially_eval_for_maximum", most, [&](const RUN& r, BITS v, bool undefined) {
                    return !undefined && wide(v, form) >= value(r);
                });
            if (NODE* least = partially_eval_for_minimum(tree, loop, bounded))
                expect_result("partially_eval_for_minimum", least, [&](const RUN& r, BITS v, bool undefined) {
                    return !undefined && wide(v, form) <= value(r);
                });
        }
    }

    // For the values of half of the runs, with a step that reaches one of them.
    void check_range_simplifier() {
        const WIDE x = value(trial.runs.front()), y = value(trial.runs.back()), low = std::min(x, y),
                   high = std::max(x, y);
        for (WIDE step : {WIDE(1), WIDE(3), std::max(WIDE(1), high - low)}) {
            if (!wrong.empty()) return;
            NODE* simplified = simp_tree_in_range(copy_tree(tree), narrow(low), narrow(high), narrow(step));
            if (form_of(simplified->type) == form) {
                const std::string question = "simp_tree_in_range " + value_text(static_cast<BITS>(low), form) + " to " +
                                             value_text(static_cast<BITS>(high), form) + " by " +
                                             value_text(static_cast<BITS>(step), form);
                expect_result(question.c_str(), simplified, [&](const RUN& r, BITS v, bool undefined) {
                    const WIDE own = value(r);
                    const bool applies = own >= low && own <= high && (own - low) % step == 0;
                    return !applies || (!undefined && wide(v, form) == own);
                });
            } else {
                expect("simp_tree_in_range, type", [](const RUN&) { return false; });
                erase_tree(simplified);
            }
        }
    }

    const TRIAL& trial;
    const NODE* const tree;
    const FORM form;
    struct LOOP* const loop;
    std::string wrong;
    const RUN* wrong_run = nullptr;
};

FINDING TRIAL::check_facts() const { return FACTS(*this).run(); }

} // namespace treecheck
