#include "tools/treecheck/checker.h"

#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/ir/walks.h"
#include "OPT5/simp/simp.h"
#include "OPT5/simp/symbolic.h"

#include <cstring>
#include <set>

namespace treecheck {

// ---- Operations
namespace {

bool is_scalar(const NODE* t) { return form_of(t->type).bits != 0; }
bool is_no_assignment(const NODE* t) { return !opcode_is_ASG(t->op); }

bool is_true(BITS v, const FORM& f) { return f.is_float ? as_double(v) != 0 : v != 0; }
bool same_truth(BITS expected, const FORM& before, BITS value, const FORM& after) {
    return is_true(expected, before) == is_true(value, after);
}
bool is_int(const FORM& f) { return !f.is_float && !f.is_pointer && !f.is_bool && f.bits == 16 && f.is_signed; }
bool truth_as_int(BITS expected, const FORM& before, BITS value, const FORM& after) {
    return is_int(after) && value == (is_true(expected, before) ? 1 : 0);
}
bool opposite_as_int(BITS expected, const FORM& before, BITS value, const FORM& after) {
    return is_int(after) && value == (is_true(expected, before) ? 0 : 1);
}

} // namespace

namespace {

NODE* put_casts_in(NODE* t, struct LOOP*) { return insert_mandatory_casts(t); }
NODE* simplify(NODE* t, struct LOOP* loop) { return simp_tree(t, loop); }
NODE* simplify_twice(NODE* t, struct LOOP* loop) { return simp_tree(simp_tree(t, loop), loop); }
NODE* for_control(NODE* t, struct LOOP* loop) { return simp_for_control(simp_tree(t, loop), loop); }
NODE* as_boolean(NODE* t, struct LOOP* loop) { return make_boolean(simp_tree(t, loop), loop); }
NODE* inverted(NODE* t, struct LOOP* loop) { return invert_boolean_tree(simp_tree(t, loop)); }
NODE* peeled(NODE* t, struct LOOP*) { return peel_for_effect(t); }
NODE* simplified_and_peeled(NODE* t, struct LOOP* loop) { return peel_for_effect(simp_tree(t, loop)); }
NODE* folded(NODE* t, struct LOOP*) { return fold_constants(t); }

NODE* reassociated(NODE* t, struct LOOP* loop) { return simp_assoc(simp_tree(t, loop), loop); }
NODE* as_address(NODE* t, struct LOOP* loop) { return simp_ss_tree(t, loop); }

// By one of the variables, in front.
NODE* bubbled(NODE* t, struct LOOP*) {
    NODE* term = nullptr;
    for_each_node(t, [&](NODE* n) {
        if (n->op == NAME && n->type->is_scalar() && !n->type->is_volatile()) term = n;
    });
    if (!term) return t;
    term = copy_tree(term);
    t = bubble_term_to_top(t, term);
    erase_tree(term);
    return t;
}

// x = c, e with x not written in e: e under the knowledge that x is c.
bool begins_with_known_value(const NODE* t) {
    if (t->op != COMMAOP || t->left->op != ASG || t->left->left->op != NAME || t->left->right->op != ICON) return false;
    const SYMTAB* x = t->left->left->u.sym;
    if (x->level == 0 || x->is_aliased() || x->type->is_volatile() || !x->type->is_int()) return false;
    bool is_written = false;
    for_each_node(t->right, [&](const NODE* n) {
        is_written = is_written || (opcode_is_ASG(n->op) && n->left->op == NAME && n->left->u.sym == x);
    });
    return !is_written;
}
NODE* with_known_value(NODE* t, struct LOOP*) {
    const NODE* x = t->left->left;
    t->right = simp_subst_icon(truncate_to_type(t->left->right->u.lval, x->type), x->type->stqs(), x, t->right);
    return t;
}

bool is_integer(const NODE* t) { return t->type->is_int() && !t->type->is_bool(); }
template <uint64_t MASK>
NODE* masked(NODE* t, struct LOOP* loop) {
    return prop_mask_into_subtree(simp_tree(t, loop), INT65(0, MASK));
}
template <uint64_t MASK>
bool same_bits(BITS expected, const FORM& before, BITS value, const FORM& after) {
    return before == after && ((expected ^ value) & MASK) == 0;
}

} // namespace

const OPERATION mandatory_casts = {"casts", is_no_assignment, put_casts_in, nullptr, true};

const std::vector<OPERATION> operations = {
    {"simp", nullptr, simplify, nullptr, true},
    {"twice", nullptr, simplify_twice, nullptr, true},
    {"control", is_scalar, for_control, same_truth, true},
    {"boolean", is_scalar, as_boolean, truth_as_int, true},
    {"invert", is_scalar, inverted, opposite_as_int, true},
    {"peel", nullptr, peeled, nullptr, false},
    {"peel after simp", nullptr, simplified_and_peeled, nullptr, false},
    {"fold", nullptr, folded, nullptr, true},
    {"assoc", nullptr, reassociated, nullptr, true},
    {"address", nullptr, as_address, nullptr, true},
    {"bubble", nullptr, bubbled, nullptr, true},
    {"known value", begins_with_known_value, with_known_value, nullptr, true},
    {"mask 1", is_integer, masked<1>, same_bits<1>, true},
    {"mask ff", is_integer, masked<0xFF>, same_bits<0xFF>, true},
    {"mask 8000", is_integer, masked<0x8000>, same_bits<0x8000>, true},
    {"mask ff00ffff0", is_integer, masked<0xFF00FFFF0>, same_bits<0xFF00FFFF0>, true},
};

// ---- Contents of variables
namespace {

uint64_t boundary(int n, int bits) {
    const uint64_t top = uint64_t(1) << (bits - 1);
    switch (n) {
    case 0: return 0;
    case 1: return 1;
    case 2: return ~uint64_t(0);
    case 3: return top;
    default: return top - 1;
    }
}

double interesting_double(RANDOM& random) {
    static const double some[] = {0.0,    -0.0,    1.0,        -1.0, 2.0,   0.5,       3.0,        0.1,      1e30,
                                  -1e-30, 65536.0, 16777217.0, 7.0,  100.0, 1.0 / 0.0, -1.0 / 0.0, 0.0 / 0.0};
    return some[random.pick(17)];
}

void put(MEMORY* m, uint32_t at, uint64_t bits, uint64_t units) {
    for (uint64_t i = 0; i < units; ++i) (*m)[at + i] = static_cast<uint16_t>(bits >> (16 * i));
}

uint64_t scalar_content(const TYPE* type, int n, RANDOM& random) {
    if (type->is_float()) {
        const double d = n < 5 ? (n == 3 ? -0.0 : n == 4 ? 2.5 : n == 2 ? -1.0 : n) : interesting_double(random);
        if (type->size == 64) return from_double(d);
        const float f = static_cast<float>(d);
        uint32_t w;
        memcpy(&w, &f, sizeof w);
        return w;
    }
    if (type->is_bool()) return n < 5 ? boundary(n, 16) & 1 : random.pick(2);
    const int bits = static_cast<int>(type->size);
    if (n < 5) return boundary(n, bits);
    const uint64_t v = random.next();
    switch (random.pick(6)) {
    case 0: return boundary(static_cast<int>(random.pick(5)), bits);
    case 1: return random.pick(10);
    case 2: return -static_cast<uint64_t>(random.pick(10));
    case 3: return uint64_t(1) << random.pick(static_cast<unsigned>(bits));
    case 4: return v >> random.pick(64);
    }
    return v;
}

uint32_t some_address(const TYPE* pointee, RANDOM& random) {
    const WORLD& w = world();
    if (pointee->is_csu()) return w.address(random.pick(2) ? w.record : w.other_record);
    if (pointee->size == 16 && random.pick(3)) return w.address(w.array) + random.pick(8);
    return w.address(w.addressed[pointee->size == 16 ? 0 : 1]);
}

void fill_memory(MEMORY* memory, int n, RANDOM& random) {
    memory->fill(0);
    for (const SYMTAB* s : world().objects) {
        const uint32_t at = world().address(s);
        if (s->type->is_pointer())
            put(memory, at, some_address(const_cast<TYPE*>(s->type)->type_pointed_to(), random), 2);
        else if (s->type->is_complex())
            for (uint32_t part = 0, units = static_cast<uint32_t>(s->type->size) / 32; part < 2; ++part)
                put(memory, at + part * units, scalar_content(s->type->part_type(), n, random), units);
        else if (s->type->is_scalar())
            put(memory, at, scalar_content(s->type, n, random), s->type->size / 16);
        else
            for (uint64_t i = 0; i < s->type->size / 16; ++i)
                put(memory, at + static_cast<uint32_t>(i), n < 5 ? boundary(n, 16) : random.next() >> 40, 1);
    }
}

constexpr int BOUNDARY_ASSIGNMENTS = 5, IMAGES = 2048;

// Ready-made contents of memory; the first of each BOUNDARY_ASSIGNMENTS are the boundaries.
const MEMORY& image(uint64_t n) {
    static const std::vector<MEMORY>* made = nullptr;
    if (!made) {
        auto* all = new std::vector<MEMORY>(IMAGES);
        RANDOM random(1);
        for (int i = 0; i < IMAGES; ++i) fill_memory(&(*all)[static_cast<size_t>(i)], i, random);
        made = all;
    }
    return (*made)[n % IMAGES];
}

std::string event_text(const std::vector<EVENT>& events) {
    std::string s;
    for (const EVENT& e : events) {
        char text[40];
        snprintf(text, sizeof text, " %c:%llx", e.kind, static_cast<unsigned long long>(e.what & 0xFFFFFF));
        s += text;
    }
    return s.empty() ? " none" : s;
}

std::string tree_text(const NODE* t) { return t ? tree_to_infix(t) : "nothing"; }

} // namespace

void TRIAL::begin(EVALUATOR* e, int assignment) const {
    RANDOM random(seed * 64 + static_cast<uint64_t>(assignment));
    const uint64_t r = random.next();
    if (assignment < BOUNDARY_ASSIGNMENTS) {
        e->begin(image(static_cast<uint64_t>(assignment)), r);
        return;
    }
    e->begin(image(BOUNDARY_ASSIGNMENTS + r % (IMAGES - BOUNDARY_ASSIGNMENTS)), r);
    if (constants.empty()) return;
    for (const SYMTAB* s : variables)
        if (random.one_in(2)) {
            const uint64_t v = random.of(constants) + random.pick(3) - 1;
            put(&e->memory, world().address(s), s->type->is_bool() ? v & 1 : v, s->type->size / 16);
        }
}

std::string TRIAL::contents(int assignment) const {
    EVALUATOR e;
    begin(&e, assignment);
    std::set<std::string> lines;
    for_each_node(const_cast<NODE*>(tree), [&](const NODE* t) {
        if (t->op != NAME || !form_of(t->type).bits || t->type->is_volatile()) return;
        lines.insert(std::string(t->u.sym->name) + " = " + value_text(e.eval(t), form_of(t->type)));
    });
    std::string s;
    for (const std::string& line : lines) s += (s.empty() ? "" : ", ") + line;
    return s;
}

// ---- Surroundings
SURROUNDINGS::~SURROUNDINGS() {
    for (NODE* fact : givens) erase_tree(fact);
}

std::string SURROUNDINGS::text() const {
    std::string s;
    for (const NODE* fact : givens) s += "; given " + tree_to_infix(fact);
    return s;
}

namespace {
const SURROUNDINGS& behind(const struct LOOP* loop) { return *reinterpret_cast<const SURROUNDINGS*>(loop); }
} // namespace

struct LOOP* SURROUNDINGS::loop() const {
    loop_callbacks.givens = [](const struct LOOP* loop) -> const std::vector<NODE*>& { return behind(loop).givens; };
    loop_callbacks.is_constant_in = [](const NODE* t, const struct LOOP* loop) {
        bool varies = false;
        for_each_node(const_cast<NODE*>(t), [&](const NODE* n) {
            varies = varies || op_has_effect(n->op) ||
                     (n->op == NAME ? behind(loop).varying.count(n->u.sym) != 0
                                    : n->op == UMULT || n->op == STDOT || n->op == STREF);
        });
        return !varies;
    };
    return reinterpret_cast<struct LOOP*>(const_cast<SURROUNDINGS*>(this));
}

TRIAL::TRIAL(const NODE* t, uint64_t case_seed, int assignments, const SURROUNDINGS* surroundings)
    : tree(t), seed(case_seed), around(surroundings), form(form_of(t->type)) {
    auto collect = [this](const NODE* n) {
        if (n->op == ICON) constants.push_back(n->u.lval.value);
        if (n->op == NAME && n->type->is_int() && !n->type->is_volatile()) variables.push_back(n->u.sym);
    };
    for_each_node(const_cast<NODE*>(tree), collect);
    if (around)
        for (NODE* fact : around->givens) for_each_node(fact, collect);
    EVALUATOR e;
    runs.reserve(static_cast<size_t>(assignments));
    for (int n = 0; n < assignments; ++n) {
        if (around && !givens_hold(&e, n)) continue;
        begin(&e, n);
        const BITS v = e.eval(tree);
        if (!e.undefined) runs.push_back({n, v, e.overflowed, e.events, e.memory});
    }
}

bool TRIAL::givens_hold(EVALUATOR* e, int assignment) const {
    for (const NODE* fact : around->givens) {
        begin(e, assignment);
        if (!e->truth(fact) || e->undefined) return false;
    }
    return true;
}

FINDING TRIAL::check(const OPERATION& op) const {
    FINDING finding;
    if (runs.empty() || (op.takes && !op.takes(tree))) return finding;
    NODE* result = op.apply(copy_tree(tree), around ? around->loop() : nullptr);
    auto report = [&](const std::string& what, int assignment) {
        finding.what = std::string(op.name) + ": " + what;
        finding.before = tree_text(tree);
        finding.after = tree_text(result);
        if (assignment >= 0) finding.contents = contents(assignment);
        if (around) finding.contents += around->text();
    };
    const FORM after = result ? form_of(result->type) : form;
    if (op.value_counts && !op.agrees && !(after == form)) report("the result has another type", -1);
    EVALUATOR e;
    e.null_is_passed = true;
    for (const RUN& r : runs) {
        if (finding) break;
        begin(&e, r.assignment);
        const BITS v = result ? e.eval(result) : 0;
        const bool agrees = op.agrees ? op.agrees(r.value, form, v, after) : same_value(r.value, v, form);
        if (e.undefined)
            report("the result does something undefined", r.assignment);
        else if (op.value_counts && form.bits && !agrees)
            report("value " + value_text(v, after) + " for " + value_text(r.value, form), r.assignment);
        else if (e.events != r.events)
            report("effects" + event_text(e.events) + " for" + event_text(r.events), r.assignment);
        else if (e.memory != r.memory)
            report("another content of memory", r.assignment);
        else if (e.overflowed && !r.overflowed)
            report("a signed operation overflows that did not", r.assignment);
    }
    if (result) erase_tree(result);
    return finding;
}

} // namespace treecheck
