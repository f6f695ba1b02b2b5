// What keeps the iterations of loops apart, in words: of each loop of a function with records, the dependences that it
// carries.
#include "tools/model/ic_print.h"

#include "IFILE/pragma.h"

#include <algorithm>
#include <cstring>
#include <map>

namespace {
enum : uint8_t { HAS_DISTANCE = 1, BACKWARD = 2, SAME = 4, FORWARD = 8, FAR = 16 };

struct PLACE_OF_ACCESS {
    std::string text;
    uint32_t loop = 0;
    long line = 0;
};
struct LOOP_WORDS {
    uint32_t outer = 0;
    bool has_record = false;
    long line = 0;
    bool calls = false;
    std::vector<std::string> dependences;
};

// How much later the second access comes, if the loop of this level is the outermost whose iterations differ.
std::string distance_at(const IC_FACTS& v, size_t level) {
    for (size_t k = 1; k < level; k++)
        if (!(v.elements[k].direction & SAME)) return "";
    const DD_ENTRY e = v.elements[level];
    if (!(e.direction & FORWARD)) return "";
    if (!(e.direction & HAS_DISTANCE)) return "some iterations later ";
    const char* unit = e.direction & FAR ? " or more iterations later " : " iterations later ";
    return std::to_string(e.distance) + (e.distance == 1 && !(e.direction & FAR) ? " iteration later " : unit);
}

class DEPENDENCE_WORDS {
public:
    DEPENDENCE_WORDS(const IC_UNIT& unit, size_t first, size_t last) : unit_m(unit), first_m(first), last_m(last) {}

    std::vector<std::string> find() {
        for (size_t i = first_m; i <= last_m; i++) read(unit_m.items[i]);
        for (size_t i = first_m; i <= last_m; i++)
            if (unit_m.items[i].kind == IFR_DEP_EDGE) tell(*unit_m.items[i].facts);
        std::vector<std::string> lines;
        for (const auto& [id, loop] : loops) {
            if (!loop.has_record || loop.outer == id) continue; // the function is its own outer loop
            const std::string name = "loop " + std::to_string(id) + " of line " + std::to_string(loop.line);
            const std::string calls = loop.calls ? ", calls aside" : "";
            lines.push_back(name + (loop.dependences.empty() ? ": memory does not keep its iterations apart"
                                                             : ": its iterations are kept apart by memory") + calls);
            for (const std::string& d : loop.dependences) lines.push_back("    " + d);
        }
        return lines;
    }

private:
    void read(const IC_ITEM& item) {
        switch (item.kind) {
        case IFR_LOOP:
            loops[item.facts->word[0]].outer = item.facts->word[1];
            loops[item.facts->word[0]].has_record = true;
            break;
        case IFR_LOOP_VAR:
            at = item.facts->word[0];
            if (!loops[at].line) loops[at].line = source_line;
            source_line = 0;
            break;
        case IFR_PRAGMA: // of the loop that comes next
            if (!std::strcmp(item.pragma->name(), "SRC_LOOP") && !item.pragma->args.empty())
                source_line = std::atol(item.pragma->args[0].c_str());
            break;
        case IFR_DEP_VECTOR: vectors[item.facts->word[0]] = item.facts; break;
        case IFR_EXPR: {
            const long line = item.psn ? item.psn->line : 0;
            if (!loops[at].line) loops[at].line = line;
            read_tree(item.tree, line);
            break;
        }
        default: break;
        }
    }
    void read_tree(const IC_NODE* t, long line) {
        for (; t; t = t->left) {
            if (t->op == if_op::DDNODE) accesses[t->number] = {ic_expr_text(t->left, {}), at, line};
            if (t->op == if_op::CALL || t->op == if_op::UCALL)
                for (uint32_t l = at;; l = loops[l].outer) {
                    loops[l].calls = true;
                    if (loops[l].outer == l) break;
                }
            read_tree(t->right, line);
        }
    }
    // The loops around both, the outermost first.
    std::vector<uint32_t> nest(uint32_t loop) {
        std::vector<uint32_t> around;
        for (; loops[loop].outer != loop; loop = loops[loop].outer) around.push_back(loop);
        std::reverse(around.begin(), around.end());
        return around;
    }
    void tell(const IC_FACTS& edge) {
        const auto from = accesses.find(edge.word[0]), to = accesses.find(edge.word[1]);
        const auto v = vectors.find(edge.word[2]);
        if (from == accesses.end() || to == accesses.end() || v == vectors.end() || (v->second->flags & 3)) return;
        const std::vector<uint32_t> around = nest(from->second.loop);
        for (size_t level = 1; level < v->second->elements.size() && level <= around.size(); level++) {
            const std::string distance = distance_at(*v->second, level);
            if (distance.empty()) continue;
            const PLACE_OF_ACCESS &a = from->second, &b = to->second;
            loops[around[level - 1]].dependences.push_back(
                a.text + " of line " + std::to_string(a.line) + ", and " + distance +
                (from == to ? "itself" : b.text + " of line " + std::to_string(b.line)));
        }
    }

    const IC_UNIT& unit_m;
    size_t first_m, last_m;
    uint32_t at = 0;
    long source_line = 0;
    std::map<uint32_t, LOOP_WORDS> loops;
    std::map<uint32_t, const IC_FACTS*> vectors;
    std::map<uint32_t, PLACE_OF_ACCESS> accesses;
};
} // namespace

std::vector<std::string> ic_dependence_words(const IC_UNIT& unit, size_t first, size_t last) {
    return DEPENDENCE_WORDS(unit, first, last).find();
}
