// Functions: the frame, the statements, labels and switches.
#include "tools/exec/compile.h"
#include "tools/exec/trips.h"

#include <algorithm>
#include <cctype>
#include <string_view>
#include <unordered_set>

namespace {
enum : int { class_global = 2, class_static = 3, class_extern = 5 };

// Inline assembly is passed over, as text whose effect is not known; only a checked run ends there, unless the text
// does nothing.
bool is_comment(const char* text) {
    while (*text == ' ' || *text == '\t') text++;
    return *text == 0 || *text == ';' || *text == '*' || *text == '\n';
}
// The symbols whose address a tree takes.
void collect_addressed(const IC_NODE* n, std::unordered_set<const IC_SYMBOL*>& addressed) {
    for (; n; n = n->left) {
        const IC_NODE* place = n->op == op::UAND ? strip_marks(n->left) : nullptr;
        if (place && place->op == op::NAME) addressed.insert(place->sym);
        collect_addressed(n->right, addressed);
    }
}

bool writes_left(int o) {
    const std::string_view name = if_node_info[o].name;
    const bool assigns = name.size() > 2 && name.substr(name.size() - 3) == "ASG";
    return assigns || o == op::PLUSPLUS || o == op::MINMIN || o == op::ENDLOOP;
}
int64_t count_down(const XNODE* x, MACHINE& m) { return run(x->a, m) == 0; }
} // namespace

// Parameters and locals, each at a multiple of its alignment below the frame pointer. Statics and declarations of
// objects elsewhere have their places among the unit's objects. The last named parameter of a variadic function is at
// the frame pointer, and the arguments that have no name lie behind it.
void COMPILER::lay_out_frame() {
    size_t parameter = 0;
    std::unordered_set<const IC_SYMBOL*> addressed;
    for (size_t i = f->source->first; i <= f->source->last && i < p.unit.items.size(); i++)
        if (p.unit.items[i].kind == IFR_EXPR) collect_addressed(p.unit.items[i].tree, addressed);
    for (IC_SYMBOL* s : f->source->locals) {
        if (s->sclass == class_static || s->sclass == class_extern || p.entries.count(s)) continue;
        const SHAPE shape = shape_of(s->type);
        const uint64_t units = std::max<uint64_t>({shape.units, (s->size + 15) / 16, 1});
        const uint64_t mask = units > 1 ? std::max<uint64_t>(shape.align_mask, 1) : shape.align_mask;
        const bool is_parameter = s->level == 1 && parameter < f->params.size();
        if (f->variadic && is_parameter && parameter + 1 == f->params.size()) {
            locals[s] = {B_FRAME, 0, units, false};
            f->params[parameter++].offset = 0;
            continue;
        }
        f->frame = (f->frame + units + mask) & ~mask;
        const bool is_scalar = shape.is_int() || shape.is_float();
        locals[s] = {B_FRAME, -static_cast<int64_t>(f->frame), units,
                     is_scalar && !addressed.count(s) && !s->type->is_volatile()};
        if (is_parameter) f->params[parameter++].offset = locals[s].at;
    }
}

STMT& COMPILER::add(STMT_KIND kind, uint32_t line) {
    f->code.emplace_back();
    f->code.back().kind = kind;
    f->code.back().line = line;
    if (!f->loops.empty()) f->loop_of.resize(f->code.size(), loop);
    return f->code.back();
}

void COMPILER::define(uint32_t label) {
    labels[label] = labelled = static_cast<uint32_t>(f->code.size());
    for (TRIP_PROMISE& t : promised) {
        t.head = labels[label];
        t.tested_last = keyword == "do";
        t.tested_first = keyword == "for" || keyword == "while";
        f->promises.push_back(std::move(t));
    }
    promised.clear();
    keyword.clear();
}

void COMPILER::promise(const PRAGMA& pragma) {
    TRIP_PROMISE t;
    if (std::strcmp(pragma.name(), "MUST_ITERATE") == 0) {
        if (read_promise(pragma, t)) promised.push_back(t);
    } else if (std::strcmp(pragma.name(), "SRC_LOOP") == 0 && pragma.args.size() > 3) {
        keyword = pragma.args[3];
    }
}

void COMPILER::switch_table() {
    p.tables.emplace_back();
    SWITCH_TABLE& table = p.tables.back();
    table.other = static_cast<uint32_t>(f->code.size()); // behind the statement
    f->code.back().table = &table;
}

// The accesses below the marks of a tree. What is written stands left of an assignment, perhaps below parts of it.
void COMPILER::find_numbers(const IC_NODE* n) {
    for (; n; n = n->left) {
        if (n->op == op::DDNODE) numbered.insert({strip_marks(n), {n->number, false}});
        if (writes_left(n->op)) {
            const IC_NODE* place = n->left;
            while (place && place->op != op::DDNODE && place->op != op::UMULT && place->op != op::NAME) place = place->left;
            if (place && place->op == op::DDNODE) numbered.insert({strip_marks(place), {place->number, true}});
        }
        find_numbers(n->right);
    }
}

void COMPILER::statement(const IC_NODE* n, uint32_t line) {
    n = strip_marks(n);
    if (f->dependences) find_numbers(n);
    cost = 1;
    if (n->op == op::LOOP) {
        if (const IC_NODE* l = strip_marks(n->right); l && l->op == op::LABEL) define(l->number);
        return;
    }
    STMT& s = add(S_EXPR, line);
    const uint32_t at = static_cast<uint32_t>(f->code.size() - 1);
    switch (n->op) {
    case op::BRANCH:
        s.kind = S_BRANCH;
        jumps.push_back({at, strip_marks(n->left)});
        break;
    case op::CBRANCH: {
        const XNODE* x = truth(n->left);
        f->code[at].kind = S_CBRANCH;
        f->code[at].tree = x;
        jumps.push_back({at, strip_marks(n->right)});
        break;
    }
    case op::ENDLOOP: { // counts down; the loop ends when the counter passes 0
        IC_NODE one(nullptr), minus(nullptr);
        one.op = op::ICON;
        one.type = n->left->type;
        one.value = 1;
        minus.op = op::MINUSASG;
        minus.type = n->left->type;
        minus.left = n->left;
        minus.right = &one;
        const SHAPE shape = shape_of(n->left->type);
        const XNODE* left = value(&minus);
        const XNODE* up = p.node(binary_eval(op::PLUS, shape.rep), left, constant(1));
        f->code[at].kind = S_CBRANCH;
        f->code[at].tree = p.node(count_down, up);
        jumps.push_back({at, strip_marks(n->right)});
        break;
    }
    case op::SWITCH: {
        const XNODE* x = value(n->left);
        f->code[at].kind = S_SWITCH;
        f->code[at].tree = x;
        switch_table();
        jumps.push_back({at, n});
        break;
    }
    case op::RETURN: {
        const XNODE* x = f->result.rep == R_VOID ? value(n->right) : value_as(n->right, f->result);
        f->code[at].kind = S_RETURN;
        f->code[at].tree = x;
        break;
    }
    case op::URETURN: s.kind = S_URETURN; break;
    case op::UMCALL:
        if (std::strcmp(n->text, "_never_executed") == 0) { // what stands behind does not follow it
            s.kind = S_FAIL;
            s.status = EXEC_UNREACHABLE;
            s.text = "reached a place that is never executed";
            break;
        }
        [[fallthrough]];
    default: {
        const XNODE* x = value(n);
        f->code[at].tree = x;
    }
    }
    f->code[at].cost = cost;
}

// A branch to nowhere fails when it is executed.
uint32_t COMPILER::target(uint32_t label) {
    if (auto it = labels.find(label); it != labels.end()) return it->second;
    STMT& s = add(S_FAIL, 0);
    s.status = EXEC_BAD_FILE;
    s.text = "branch to a label that is nowhere";
    return static_cast<uint32_t>(f->code.size() - 1);
}

void COMPILER::exceptions(const IC_ITEM& item) {
    f->handling.resize(size_t(item.number) + 1);
    const size_t calls_of_statements = f->handled_calls.size();
    for (uint32_t i = 0; i < item.number; ++i) {
        const EHT_ENTRY& entry = item.eht[i];
        HANDLING& h = f->handling.at(entry.id);
        h.kind = entry.kind;
        h.next = entry.next;
        if (entry.cleanup) h.cleanup = value(static_cast<const IC_NODE*>(entry.cleanup));
        for (const I_CATCH_ENTRY& c : entry.catches) h.clauses.emplace_back(c.type_name, target(c.label));
    }
    f->handled_calls.resize(calls_of_statements);
}

// Labels are known now: branches and switches get their targets.
void COMPILER::resolve() {
    auto find = [&](const IC_NODE* label, uint32_t& to) {
        to = target(label && label->op == op::LABEL ? label->number : UINT32_MAX);
    };
    for (auto [at, n] : jumps) {
        uint32_t target = 0;
        if (n && n->op == op::SWITCH) {
            auto& table = const_cast<SWITCH_TABLE&>(*f->code[at].table);
            const SHAPE shape = shape_of(strip_marks(n->left)->type);
            std::vector<const IC_NODE*> rest{n->right};
            while (!rest.empty()) {
                const IC_NODE* c = strip_marks(rest.back());
                rest.pop_back();
                if (!c) continue;
                if (c->op == op::COMMA) {
                    rest.push_back(c->right);
                    rest.push_back(c->left);
                } else if (c->op == op::CASE) {
                    find(strip_marks(c->right), target);
                    table.cases.push_back({number(strip_marks(c->left), shape)->k, target});
                } else if (c->op == op::DEFAULT) {
                    find(strip_marks(c->left), table.other);
                }
            }
            std::sort(table.cases.begin(), table.cases.end());
        } else {
            find(n, target);
            f->code[at].target = target;
        }
    }
}

// The label of an outer loop's head and that of an inner one's are two places, though no statement stands between.
void COMPILER::enter_loop(uint32_t id, uint32_t line) {
    if (p.options.check && !f->loops.empty() && id != loop && labelled == f->code.size()) {
        STMT& s = add(S_EXPR, line);
        s.tree = constant(0);
        s.cost = 0;
    }
    loop = id;
}

void COMPILER::function() {
    const IC_FUNC& source = *f->source;
    lay_out_frame();
    uint32_t line = 0;
    for (size_t i = source.first; i <= source.last && i < p.unit.items.size(); i++) {
        const IC_ITEM& item = p.unit.items[i];
        if (item.psn) line = static_cast<uint32_t>(item.psn->line);
        switch (item.kind) {
        case IFR_EXPR:
            if (item.tree) statement(item.tree, line);
            break;
        case IFR_LABEL: define(item.number); break;
        case IFR_EHT_HEADER:
            exception_table = &item;
            f->dependences = nullptr;
            break;
        case IFR_PRAGMA:
            if (p.options.check) promise(*item.pragma);
            break;
        case IFR_LOOP:
            if (p.options.check) {
                const uint32_t* w = item.facts->word;
                f->loops.push_back({w[0], w[1], w[2], w[3], w[4]});
                if (!f->dependences) f->dependences = std::make_shared<DEPENDENCES>();
            }
            break;
        case IFR_DEP_VECTOR:
            if (f->dependences) f->dependences->add_vector(item.facts);
            break;
        case IFR_DEP_EDGE:
            if (f->dependences) f->dependences->add_edge(item.facts->word[0], item.facts->word[1], item.facts->word[2]);
            break;
        case IFR_LOOP_VAR: enter_loop(item.facts->word[0], line); break;
        case IFR_ASM:
            if (p.options.check && !is_comment(item.text)) {
                STMT& s = add(S_FAIL, line);
                s.status = EXEC_UNSUPPORTED;
                s.text = "inline assembly cannot be executed";
            }
            break;
        default: break;
        }
    }
    add(S_URETURN, line);
    if (exception_table) exceptions(*exception_table);
    resolve();
    const std::string fault = bind_loop_records(*f);
    if (!fault.empty()) throw EXEC_ERROR{EXEC_TRIPS, fault + " (in " + f->name + ", line " + std::to_string(f->code.front().line) + ")"};
    find_promised_loops(*f);
    if (numbered.empty()) f->dependences = nullptr;
    if (f->dependences) f->dependences->find_nests(f->code, p.options.innermost);
    f->frame = (f->frame + 3) & ~uint64_t{3};
    f->depth = deepest;
}
