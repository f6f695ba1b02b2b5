// The control flow of a function as a graph: straight runs of statements, and an edge to each run that may follow.
#include "tools/model/ic_print.h"

#include <map>

using namespace if_op;

namespace {
struct BLOCK {
    std::string text;
    std::vector<std::pair<uint32_t, const char*>> jumps; // label, and what the edge is called
    bool falls_through = true;
    bool returns = false;
    bool empty = true;
};

std::string escaped(const std::string& line) {
    std::string text;
    for (char c : line) {
        if (c == '"' || c == '\\') text += '\\';
        text += c;
    }
    return text + "\\l";
}

uint32_t target(const IC_NODE* label) { return label && label->op == LABEL ? label->number : 0; }

// What a statement does to the block that it ends; false if it ends none.
bool end_block(const IC_NODE* t, BLOCK& block) {
    switch (t->op) {
    case RETURN:
    case URETURN:
        block.falls_through = false;
        block.returns = true;
        return true;
    case BRANCH:
        block.falls_through = false;
        block.jumps.emplace_back(target(t->left), "");
        return true;
    case CBRANCH: block.jumps.emplace_back(target(t->right), "false"); return true;
    case SWITCH: {
        block.falls_through = false;
        const IC_NODE* arm = t->right;
        for (;; arm = arm->left) {
            const IC_NODE* one = arm && arm->op == COMMA ? arm->right : arm;
            if (one && one->op == CASE) block.jumps.emplace_back(target(one->right), "case");
            if (one && one->op == DEFAULT) block.jumps.emplace_back(target(one->left), "default");
            if (!arm || arm->op != COMMA) return true;
        }
    }
    }
    return false;
}

void print_function(FILE* out, const IC_UNIT& unit, const IC_FUNC& f, size_t number) {
    std::vector<BLOCK> blocks(1);
    std::map<uint32_t, size_t> block_of_label;
    for (size_t i = f.first; i <= f.last; i++) {
        const IC_ITEM& item = unit.items[i];
        if (item.kind == IFR_LABEL) {
            if (!blocks.back().empty) blocks.emplace_back();
            block_of_label[item.number] = blocks.size() - 1;
            blocks.back().text += "L" + std::to_string(item.number) + ":\\l";
        } else if (item.kind == IFR_EXPR && item.tree) {
            blocks.back().text += escaped(ic_expr_text(item.tree, {}));
            blocks.back().empty = false;
            if (end_block(item.tree, blocks.back())) blocks.emplace_back();
        }
    }
    if (blocks.size() > 1 && blocks.back().text.empty()) blocks.pop_back();
    std::fprintf(out, "  subgraph cluster_%zu {\n    label=\"%s\"; node [shape=box, fontname=monospace];\n", number,
                 f.sym->name);
    for (size_t b = 0; b < blocks.size(); b++) {
        std::fprintf(out, "    f%zu_b%zu [label=\"%s\"];\n", number, b, blocks[b].text.c_str());
        for (auto [label, name] : blocks[b].jumps) {
            auto to = block_of_label.find(label);
            if (to != block_of_label.end())
                std::fprintf(out, "    f%zu_b%zu -> f%zu_b%zu [label=\"%s\"];\n", number, b, number, to->second, name);
        }
        if (blocks[b].falls_through && b + 1 < blocks.size())
            std::fprintf(out, "    f%zu_b%zu -> f%zu_b%zu;\n", number, b, number, b + 1);
        if (blocks[b].returns || (blocks[b].falls_through && b + 1 == blocks.size()))
            std::fprintf(out, "    f%zu_b%zu -> f%zu_exit;\n", number, b, number);
    }
    std::fprintf(out, "    f%zu_exit [label=\"exit\", shape=oval];\n  }\n", number);
}
} // namespace

void ic_print_dot(FILE* out, const IC_UNIT& unit) {
    std::fputs("digraph unit {\n", out);
    for (size_t i = 0; i < unit.functions.size(); i++) print_function(out, unit, unit.functions[i], i);
    std::fputs("}\n", out);
}
