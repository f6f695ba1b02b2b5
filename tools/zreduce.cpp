// zreduce: makes an I-file smaller while a command keeps its outcome.
//
//   zreduce [--steps N] IN OUT -- COMMAND [WORD]...
//
// The command is run on the file as it is first; what status it ends with then, every smaller file must give too. In
// its words
// "{}" stands for the file; it is appended where no word has it. Functions, statements, branches, operands, initial
// values and symbols are taken out for as long as anything goes, the largest pieces first. OUT has the smallest file at
// each time.
#include "tools/model/ic_model.h"

#include <algorithm>
#include <cerrno>
#include <cstdlib>
#include <functional>
#include <set>
#include <string>
#include <sys/wait.h>
#include <unistd.h>
#include <vector>

using namespace if_op;

namespace {

constexpr int TROUBLE = 2;

class REDUCER {
public:
    REDUCER(IC_UNIT& reduced, std::string out_file, std::vector<std::string> command_words, long most,
            long seconds_each)
        : unit(reduced), out(std::move(out_file)), trial(out + ".trial"), command(std::move(command_words)),
          steps_left(most), seconds(seconds_each) {}

    int run();

private:
    // ---- The outcome
    bool write(const std::string& path) const;
    int status_of(const std::string& path) const;
    bool keeps_outcome();

    // ---- Pieces
    bool try_without(size_t first, size_t last);
    bool drop_functions();
    bool drop_items(const std::function<bool(const IC_ITEM&)>& may_go);
    bool drop_unused();
    bool shrink_trees();
    bool shrink(IC_NODE** place, bool is_statement);
    bool try_tree(IC_NODE** place, IC_NODE* with);
    IC_NODE* zero(TYPE* type);
    std::set<const IC_SYMBOL*> named() const;
    size_t size() const;

    IC_UNIT& unit;
    const std::string out, trial;
    const std::vector<std::string> command;
    long steps_left;
    const long seconds;
    int wanted = 0;
};

// In a process of its own: what writing marks in types does not stay.
bool REDUCER::write(const std::string& path) const {
    const pid_t child = fork();
    if (child == 0) {
        FILE* const file = std::fopen(path.c_str(), "wb");
        int failed = 1;
        try {
            failed = !file || unit.write(file, ic_type_package(), false) != 0;
        } catch (const std::exception&) {
        }
        _exit(failed);
    }
    int status = 1;
    while (child > 0 && waitpid(child, &status, 0) < 0 && errno == EINTR) {
    }
    return child > 0 && WIFEXITED(status) && WEXITSTATUS(status) == 0;
}

int REDUCER::status_of(const std::string& path) const {
    std::vector<std::string> words = command;
    words.insert(words.begin(), {"timeout", "--kill-after=1", std::to_string(seconds)}); // with all that it starts
    bool is_named = false;
    for (std::string& word : words)
        for (size_t at = word.find("{}"); at != std::string::npos; at = word.find("{}", at + path.size())) {
            word.replace(at, 2, path);
            is_named = true;
        }
    if (!is_named) words.push_back(path);
    std::vector<char*> argv;
    for (std::string& word : words) argv.push_back(word.data());
    argv.push_back(nullptr);
    const pid_t child = fork();
    if (child == 0) {
        execvp(argv[0], argv.data());
        _exit(127);
    }
    int status = -1;
    while (child > 0 && waitpid(child, &status, 0) < 0 && errno == EINTR) {
    }
    return child <= 0 ? -1 : WIFEXITED(status) ? WEXITSTATUS(status) : 128 + WTERMSIG(status);
}

bool REDUCER::keeps_outcome() {
    if (--steps_left < 0 || !write(trial) || status_of(trial) != wanted) return false;
    return std::rename(trial.c_str(), out.c_str()) == 0;
}

bool REDUCER::try_without(size_t first, size_t last) {
    const std::vector<IC_ITEM> before = unit.items;
    unit.items.erase(unit.items.begin() + static_cast<long>(first), unit.items.begin() + static_cast<long>(last));
    if (keeps_outcome()) return true;
    unit.items = before;
    return false;
}

bool REDUCER::drop_functions() {
    bool any = false;
    for (size_t i = unit.items.size(); i-- > 0 && steps_left > 0;) {
        if (unit.items[i].kind != IFR_END_FUNC) continue;
        size_t first = i;
        while (first > 0 && unit.items[first].kind != IFR_BEGIN_FUNC) --first;
        any |= try_without(first, i + 1);
        i = first;
    }
    return any;
}

// Runs of such items, halved where a run must stay.
bool REDUCER::drop_items(const std::function<bool(const IC_ITEM&)>& may_go) {
    bool any = false;
    for (size_t length = 64; length > 0; length /= 2)
        for (size_t end = unit.items.size(); end > 0 && steps_left > 0;) {
            size_t first = end;
            while (first > 0 && end - first < length && may_go(unit.items[first - 1])) --first;
            if (first == end) {
                --end;
                continue;
            }
            any |= try_without(first, end);
            end = first;
        }
    return any;
}

std::set<const IC_SYMBOL*> REDUCER::named() const {
    std::set<const IC_SYMBOL*> found;
    std::vector<const IC_NODE*> waiting;
    for (const IC_ITEM& item : unit.items) {
        if (item.kind == IFR_EXPR) waiting.push_back(item.tree);
        if (item.kind == IFR_BEGIN_FUNC) found.insert(item.sym);
    }
    for (const IC_SYMBOL* s : unit.globals) waiting.insert(waiting.end(), s->init.begin(), s->init.end());
    while (!waiting.empty()) {
        const IC_NODE* t = waiting.back();
        waiting.pop_back();
        if (!t) continue;
        if (t->op == NAME) found.insert(t->sym);
        waiting.push_back(t->left);
        waiting.push_back(t->right);
    }
    return found;
}

bool REDUCER::drop_unused() {
    bool any = false;
    for (IC_SYMBOL* s : unit.globals) {
        if (s->init.empty() || steps_left <= 0) continue;
        std::vector<IC_NODE*> init;
        std::swap(init, s->init);
        if (keeps_outcome())
            any = true;
        else
            std::swap(init, s->init);
    }
    const std::set<const IC_SYMBOL*> used = named();
    const std::vector<IC_SYMBOL*> globals = unit.globals;
    const std::vector<IC_ITEM> items = unit.items;
    auto is_unused = [&used](const IC_SYMBOL* s) { return !used.count(s); };
    unit.globals.erase(std::remove_if(unit.globals.begin(), unit.globals.end(), is_unused), unit.globals.end());
    if (unit.globals.size() != globals.size()) {
        if (keeps_outcome())
            any = true;
        else
            unit.globals = globals;
    }
    return drop_items([&](const IC_ITEM& item) { return item.kind == IFR_SYMBOL && is_unused(item.sym); }) || any;
}

// ---- Trees

IC_NODE* REDUCER::zero(TYPE* type) {
    auto* t = static_cast<IC_NODE*>(unit.new_node(ICON, type));
    t->mk_icon(0);
    return t;
}

bool REDUCER::try_tree(IC_NODE** place, IC_NODE* with) {
    IC_NODE* const before = *place;
    if (!with || with == before) return false;
    *place = with;
    if (keeps_outcome()) return true;
    *place = before;
    return false;
}

bool REDUCER::shrink(IC_NODE** place, bool is_statement) {
    bool any = false;
    for (bool again = true; again && steps_left > 0;) {
        again = false;
        IC_NODE* t = *place;
        if (!t || t->op == LABEL || t->op == NAME || t->op == FIELD || t->op == ENDINIT) return any;
        for (IC_NODE* operand : {t->right, t->left})
            if (operand && (is_statement || operand->type == t->type)) again = again || try_tree(place, operand);
        if (!again && !is_statement && t->op != ICON && t->type && t->type->is_int())
            again = try_tree(place, zero(t->type));
        any |= again;
        if ((*place)->op == ICON) return any;
    }
    IC_NODE* const t = *place;
    if (t->op == CBRANCH || t->op == BRANCH || t->op == SWITCH) return shrink(&t->left, false) || any;
    for (IC_NODE** operand : {&t->left, &t->right})
        if (*operand) any |= shrink(operand, false);
    return any;
}

bool REDUCER::shrink_trees() {
    bool any = false;
    for (size_t i = 0; i < unit.items.size() && steps_left > 0; ++i)
        if (unit.items[i].kind == IFR_EXPR && unit.items[i].tree) any |= shrink(&unit.items[i].tree, true);
    return any;
}

size_t REDUCER::size() const {
    size_t nodes = 0;
    std::function<void(const IC_NODE*)> count = [&](const IC_NODE* t) {
        for (; t; t = t->left) {
            ++nodes;
            count(t->right);
        }
    };
    for (const IC_ITEM& item : unit.items)
        if (item.kind == IFR_EXPR) count(item.tree);
    return nodes;
}

int REDUCER::run() {
    if (!write(out)) {
        std::fprintf(stderr, "zreduce: %s cannot be written\n", out.c_str());
        return TROUBLE;
    }
    wanted = status_of(out);
    if (wanted == 127 || wanted < 0) {
        std::fprintf(stderr, "zreduce: %s cannot be run\n", command.front().c_str());
        return TROUBLE;
    }
    const size_t nodes = size(), items = unit.items.size();
    auto is_statement = [](const IC_ITEM& item) {
        switch (item.kind) {
        case IFR_EXPR:
        case IFR_LABEL:
        case IFR_PRAGMA:
        case IFR_COMMENT:
        case IFR_ASM:
        case IFR_LOOP:
        case IFR_LOOP_VAR:
        case IFR_DEP_EDGE:
        case IFR_DEP_VECTOR:
        case IFR_LDSPEC: return true;
        default: return false;
        }
    };
    for (bool any = true; any && steps_left > 0;) {
        any = drop_functions();
        any |= drop_items(is_statement);
        any |= shrink_trees();
        any |= drop_unused();
    }
    std::remove(trial.c_str());
    std::printf("%zu records and %zu nodes are left of %zu and %zu; the command ends with status %d\n",
                unit.items.size(), size(), items, nodes, wanted);
    return 0;
}

int usage(FILE* out) {
    std::fprintf(out, "usage: zreduce [--steps N] [--seconds N] IN OUT -- COMMAND [WORD]...\n"
                      "  makes the I-file smaller while the command, with {} for the file, keeps its status\n"
                      "  --steps N     trials at most (100000)\n"
                      "  --seconds N   for each, after which the command is ended and has status 124 (20)\n");
    return out == stdout ? 0 : TROUBLE;
}

} // namespace

int main(int argc, char** argv) {
    std::vector<std::string> words(argv + 1, argv + argc);
    if (words.size() == 1 && words[0] == "--help") return usage(stdout);
    long most = 100000, seconds = 20;
    while (words.size() > 1 && (words[0] == "--steps" || words[0] == "--seconds")) {
        (words[0] == "--steps" ? most : seconds) = std::strtol(words[1].c_str(), nullptr, 10);
        words.erase(words.begin(), words.begin() + 2);
    }
    if (words.size() < 4 || words[2] != "--" || most <= 0 || seconds <= 0) return usage(stderr);
    FILE* const in = std::fopen(words[0].c_str(), "rb");
    if (!in) {
        std::fprintf(stderr, "zreduce: %s cannot be opened\n", words[0].c_str());
        return TROUBLE;
    }
    try {
        IC_UNIT unit;
        unit.read(in, ic_type_package());
        return REDUCER(unit, words[1], {words.begin() + 3, words.end()}, most, seconds).run();
    } catch (const std::exception& error) {
        std::fprintf(stderr, "zreduce: %s: %s\n", words[0].c_str(), error.what());
        return TROUBLE;
    }
}
