// An I-file as text that a person can read: everything that its records hold, expressions in infix form.
#pragma once

#include "tools/model/ic_model.h"

struct IC_PRINT_OPTIONS {
    bool types = false;     // the type of every operator and constant
    bool positions = false; // line and column of every statement
};

void ic_print_unit(FILE* out, const IC_UNIT& unit, const IC_PRINT_OPTIONS& options);
// One expression or statement, without a line end. Recurses as deep as the tree is.
std::string ic_expr_text(const IC_NODE* tree, const IC_PRINT_OPTIONS& options);
// For each loop that the items from `first` to `last`, of one function, have a record of: what keeps its iterations apart as
// far as memory is concerned, in lines. Empty without records.
std::vector<std::string> ic_dependence_words(const IC_UNIT& unit, size_t first, size_t last);
// The control flow of each function, or of the one of that name, as a Graphviz graph. False if there is none of that name.
bool ic_print_dot(FILE* out, const IC_UNIT& unit, const std::string& function = "");
