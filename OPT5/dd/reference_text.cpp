// A tree as the programmer would write it, for remarks: globals without their underscore, addresses as subscripts.
#include "OPT5/dd/dd.h"

#include "OPT5/dd/ssa.h"
#include "OPT5/ir/trees.h"
#include "OPT5/simp/linear.h"

#include <cstdlib>
#include <vector>

namespace {

// A global has an underscore ahead of its name in C.
std::string variable_text(const NODE* name) {
    const std::string text = tree_to_infix(name);
    return name->u.sym->level == 0 && text.compare(0, 1, "_") == 0 ? text.substr(1) : text;
}

// Whatever wraps or is cast: the text is for people.
class SUM_READER final : public LINEAR_READER {
public:
    explicit SUM_READER(LINEAR_FORM* f) : LINEAR_READER(f, 64) {}

private:
    bool opens(const NODE*, const LINEAR_STEP&) override { return true; }
    bool takes_constant(const NODE*) override { return true; }
};

// By how many units one step of each subscript moves, the first subscript first.
std::vector<int64_t> strides_of(const TYPE* element) {
    std::vector<int64_t> strides;
    for (const TYPE* t = element; t; t = t->is_array() && !t->is_vector() ? t->raw_elem_type() : nullptr)
        strides.push_back(static_cast<int64_t>(t->size / 16));
    return strides;
}

void add_term(std::string& sum, int64_t coefficient, const std::string& text) {
    if (coefficient == 0) return;
    if (!sum.empty())
        sum += coefficient < 0 ? " - " : " + ";
    else if (coefficient < 0)
        sum = "-";
    const std::string times = std::to_string(std::llabs(coefficient));
    sum += text.empty() ? times : times == "1" ? text : times + " * " + text;
}

std::string term_text(const NODE* t) {
    if (t->op == NAME) return variable_text(t);
    const std::string text = tree_to_infix(t);
    return t->left && t->right ? "(" + text + ")" : text;
}

// The leaf that an address is steps from.
const NODE* base_of(const NODE* address) {
    while (address->op == PLUS || address->op == MINUS || address->op == PCONV) address = address->left;
    return address;
}

// Of an address from its base on. Each term belongs to the first subscript whose stride divides it; empty if one belongs
// to none.
std::string subscripts(const TYPE* element, const NODE* address, const NODE* base) {
    LINEAR_FORM sum(64);
    if (!SUM_READER(&sum).read(address, 1)) return "";
    const LINEAR_FORM::TERM* start = sum.find(base);
    if (!start || start->coefficient != 1) return "";
    sum.erase(start);
    std::string text;
    int64_t constant = sum.constant;
    for (int64_t stride : strides_of(element)) {
        if (stride == 0) return "";
        std::string index;
        sum.keep_if([&](const LINEAR_FORM::TERM& term) {
            if (term.coefficient % stride != 0) return true;
            add_term(index, term.coefficient / stride, term_text(term.tree));
            return false;
        });
        add_term(index, constant / stride, "");
        constant %= stride;
        text += "[" + (index.empty() ? "0" : index) + "]";
    }
    return sum.is_constant() && constant == 0 ? text : "";
}

// Of *address: `a[i][j]`, `p[i]`, `*p`; empty where no subscripts say it.
std::string text_behind(const NODE* address, const TYPE* accessed) {
    while (address->op == PCONV) address = address->left;
    const NODE* base = base_of(address);
    const bool is_object = base->op == UAND && base->left->op == NAME;
    const NODE* name = is_object ? base->left : base;
    if (name->op != NAME) return "";
    const TYPE* t = name->u.sym->type->stqs();
    if (!is_object && base == address) return "*" + variable_text(name);
    if (is_object ? !t->is_array() : !t->is_pointer()) return "";
    const TYPE *element = t->component(), *last = element;
    while (last->is_array() && !last->is_vector()) last = last->raw_elem_type();
    if (last->size != accessed->size) return "";
    const std::string text = subscripts(element, address, base);
    return text.empty() ? "" : variable_text(name) + text;
}

} // namespace

std::string reference_text(const NODE* tree) {
    NODE* t = denormalize_tree(copy_dd_tree_removing_SSA_operators(tree), false);
    std::string text = t->op == UMULT ? text_behind(t->left, t->type) : t->op == NAME ? variable_text(t) : "";
    if (text.empty()) text = tree_to_infix(t);
    erase_tree(t);
    return text;
}
