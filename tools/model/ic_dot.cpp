// The control flow of a function as a graph: straight runs of statements, and an edge to each run that may follow.
#include "tools/model/ic_print.h"

#include <map>

using namespace if_op;

namespace {
struct BLOCK {
    std::string text;
    std::vector<std::pair<uint32_t, std::string>> jumps; // label, and what the edge is called
    bool is_test = false;                                // its jump is taken where the condition holds that it shows
    bool falls_through = true;
    bool returns = false;
    bool empty = true;
    uint32_t loop = 0; // the innermost around it
};

// The loops of a function as their records have them; 0 is the function itself.
struct LOOPS {
    std::map<uint32_t, const IC_FACTS*> records;
    std::map<uint32_t, std::vector<uint32_t>> inside; // loops
    std::map<uint32_t, std::vector<size_t>> blocks;

    void add(const IC_FACTS* record) {
        const uint32_t id = record->word[0], outer = record->word[1];
        if (records.emplace(id, record).second && id && id != outer)
            inside[outer].push_back(id); // a tree, whatever they say
    }
    std::string label(uint32_t id) const {
        const uint32_t* w = records.at(id)->word;
        std::string text = "loop " + std::to_string(id) + ": " + std::to_string(w[2]);
        if (w[3] == UINT32_MAX)
            text += " or more";
        else if (w[3] != w[2])
            text += " to " + std::to_string(w[3]);
        return w[4] > 1 ? text + " by " + std::to_string(w[4]) : text;
    }
    // A box for each loop, within that of the loop around it. A nest may be deep: no recursion.
    void print(FILE* out, size_t function) const {
        struct OPEN {
            uint32_t id;
            size_t next;
        };
        std::vector<OPEN> path{{0, 0}};
        while (!path.empty()) {
            OPEN& at = path.back();
            const auto children = inside.find(at.id);
            if (children != inside.end() && at.next < children->second.size()) {
                const uint32_t child = children->second[at.next++];
                std::fprintf(out, "    subgraph cluster_%zu_%u {\n    label=\"%s\";\n", function, child,
                             label(child).c_str());
                path.push_back({child, 0});
                continue;
            }
            if (at.id && blocks.count(at.id))
                for (size_t b : blocks.at(at.id)) std::fprintf(out, "    f%zu_b%zu;\n", function, b);
            if (at.id) std::fputs("    }\n", out);
            path.pop_back();
        }
    }
};

std::string escaped(const std::string& line) {
    std::string text;
    for (char c : line) {
        if (c == '"' || c == '\\') text += '\\';
        text += c;
    }
    return text + "\\l";
}

std::string escaped_text(const IC_NODE* t) {
    const std::string line = escaped(ic_expr_text(t, {}));
    return line.substr(0, line.size() - 2);
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
    case CBRANCH:
        block.jumps.emplace_back(target(t->right), "true");
        block.is_test = true;
        return true;
    case SWITCH: {
        block.falls_through = false;
        const IC_NODE* arm = t->right;
        for (;; arm = arm->left) {
            const IC_NODE* one = arm && arm->op == COMMA ? arm->right : arm;
            if (one && one->op == CASE) block.jumps.emplace_back(target(one->right), "case " + escaped_text(one->left));
            if (one && one->op == DEFAULT) block.jumps.emplace_back(target(one->left), "default");
            if (!arm || arm->op != COMMA) return true;
        }
    }
    }
    return false;
}

void begin_block(std::vector<BLOCK>& blocks) {
    const uint32_t loop = blocks.back().loop;
    blocks.emplace_back();
    blocks.back().loop = loop;
}

void print_function(FILE* out, const IC_UNIT& unit, const IC_FUNC& f, size_t number) {
    std::vector<BLOCK> blocks(1);
    std::map<uint32_t, size_t> block_of_label;
    LOOPS loops;
    for (size_t i = f.first; i <= f.last; i++) {
        const IC_ITEM& item = unit.items[i];
        if (item.kind == IFR_LOOP) {
            loops.add(item.facts);
        } else if (item.kind == IFR_LOOP_VAR) {
            if (!blocks.back().text.empty()) blocks.emplace_back();
            blocks.back().loop = item.facts->word[0];
        } else if (item.kind == IFR_LABEL) {
            if (!blocks.back().empty) begin_block(blocks);
            block_of_label[item.number] = blocks.size() - 1;
            blocks.back().text += "L" + std::to_string(item.number) + ":\\l";
        } else if (item.kind == IFR_EXPR && item.tree) {
            blocks.back().text += escaped(ic_expr_text(item.tree, {}));
            blocks.back().empty = false;
            if (end_block(item.tree, blocks.back())) begin_block(blocks);
        }
    }
    if (blocks.size() > 1 && blocks.back().text.empty()) blocks.pop_back();
    std::fprintf(out, "  subgraph cluster_%zu {\n    label=\"%s\"; node [shape=box, fontname=monospace];\n", number,
                 f.sym->name);
    for (size_t b = 0; b < blocks.size(); b++) loops.blocks[blocks[b].loop].push_back(b);
    loops.print(out, number);
    for (size_t b = 0; b < blocks.size(); b++) {
        std::fprintf(out, "    f%zu_b%zu [label=\"%s\"];\n", number, b, blocks[b].text.c_str());
        for (const auto& [label, name] : blocks[b].jumps) {
            auto to = block_of_label.find(label);
            if (to != block_of_label.end())
                std::fprintf(out, "    f%zu_b%zu -> f%zu_b%zu [label=\"%s\"];\n", number, b, number, to->second,
                             name.c_str());
        }
        if (blocks[b].falls_through && b + 1 < blocks.size())
            std::fprintf(out, "    f%zu_b%zu -> f%zu_b%zu%s;\n", number, b, number, b + 1,
                         blocks[b].is_test ? " [label=\"false\"]" : "");
        if (blocks[b].returns || (blocks[b].falls_through && b + 1 == blocks.size()))
            std::fprintf(out, "    f%zu_b%zu -> f%zu_exit;\n", number, b, number);
    }
    std::fprintf(out, "    f%zu_exit [label=\"exit\", shape=oval];\n  }\n", number);
}
} // namespace

bool ic_print_dot(FILE* out, const IC_UNIT& unit, const std::string& function) {
    bool any = function.empty();
    std::fputs("digraph unit {\n", out);
    for (size_t i = 0; i < unit.functions.size(); i++) {
        const char* name = unit.functions[i].sym->name;
        if (!function.empty() && function != name && "_" + function != name) continue;
        print_function(out, unit, unit.functions[i], i);
        any = true;
    }
    std::fputs("}\n", out);
    return any;
}
