// icmutate: changes an I-file as a program. The result is a file of right lengths whose operators, types, labels,
// symbols, members, constants or records stand where no parser puts them; what reads I-files must refuse it with a
// message or make something of it.
//
//   icmutate SEED IN OUT    the same seed makes the same file
#include "tools/model/ic_model.h"

#include <algorithm>
#include <cstdlib>
#include <random>

namespace {

class MUTATOR {
public:
    MUTATOR(IC_UNIT& changed, uint64_t seed) : unit(changed), generator(seed) {}

    void run() {
        const int changes = 1 + static_cast<int>(below(4));
        for (int i = 0; i < changes; ++i) {
            survey();
            change();
        }
    }

private:
    // ---- Choice
    uint64_t below(uint64_t n) { return n ? generator() % n : 0; }
    bool one_in(uint64_t n) { return below(n) == 0; }
    template <class T>
    const T& any(const std::vector<T>& list) {
        return list[below(list.size())];
    }

    int64_t any_value() {
        static const std::vector<int64_t> borders = {
            0, 1, 2, 3, 15, 16, 31, 32, 63, 64, 255, 0x7FFF, 0x8000, 0xFFFF, 0x10000, INT32_MAX, int64_t(INT32_MAX) + 1,
            UINT32_MAX, INT64_MAX};
        const int64_t value = one_in(4) ? static_cast<int64_t>(generator() >> below(64)) : any(borders);
        return one_in(3) ? -value : value;
    }
    uint32_t any_number() { return one_in(3) ? static_cast<uint32_t>(any_value()) : static_cast<uint32_t>(below(12)); }
    TYPE* any_type() { return one_in(40) ? nullptr : any(types); }
    IC_SYMBOL* any_symbol() { return one_in(40) ? nullptr : any(symbols); }
    const char* any_text() {
        static const std::vector<const char*> texts = {"", "0", "1", "-1", "3", "1000000", "0x1p70", "nan", "L", "F", "text"};
        static const std::vector<const char*> names = {
            "_abs", "__builtin_expect", "quest$colon", "DONOTCSE", "_never_executed", "SORREL_HI", "SORREL_LO", "_nop",
            "__s2v", "__v2s", "__repack", "_fmin", "_max", "_add", "_isr", "main"};
        return one_in(2) ? any(texts) : any(names);
    }

    // ---- What there is to change
    void enter_tree(IC_NODE** place) {
        std::vector<IC_NODE**> waiting{place};
        while (!waiting.empty()) {
            IC_NODE** const at = waiting.back();
            waiting.pop_back();
            if (!*at) continue;
            places.push_back(at);
            if ((*at)->type) types.push_back((*at)->type);
            waiting.push_back(&(*at)->left);
            waiting.push_back(&(*at)->right);
        }
    }

    void survey() {
        places.clear();
        types.clear();
        labels.clear();
        members.clear();
        for (IC_ITEM& item : unit.items) {
            if (item.kind == IFR_EXPR && item.tree) enter_tree(&item.tree);
            if (item.kind == IFR_LABEL) labels.push_back(item.number);
        }
        symbols = unit.globals;
        for (const IC_FUNC& f : unit.functions) symbols.insert(symbols.end(), f.locals.begin(), f.locals.end());
        for (IC_SYMBOL* s : unit.globals)
            for (IC_NODE*& item : s->init) enter_tree(&item);
        for (IC_SYMBOL* s : symbols)
            if (s->type) types.push_back(s->type);
        for (TYPE* t : types)
            if (t->is_csu() && t->mdata()) members.push_back(t);
        if (types.empty()) types.push_back(tp->void_t);
        if (symbols.empty()) symbols.push_back(nullptr);
    }

    // ---- Trees
    static IC_NODE* copy(const IC_NODE* t) {
        if (!t) return nullptr;
        auto* c = new IC_NODE(*t);
        c->left = copy(t->left);
        c->right = copy(t->right);
        return c;
    }
    IC_NODE* any_tree() { return copy(*any(places)); }

    // Gives the node a payload that its operator can have in a file.
    void fill(IC_NODE* t) {
        t->value = 0;
        switch (t->op) {
        case 1: t->number = labels.empty() || one_in(8) ? any_number() : any(labels); break;
        case 2: t->sym = any_symbol(); break;
        case 3:
            t->text = any_text();
            t->number = static_cast<uint32_t>(std::strlen(t->text));
            break;
        case 4: t->value = any_value(); break;
        case 5:
        case 25:
        case 129:
        case 130:
        case 132:
        case 133: t->text = any_text(); break;
        case 26: fill_field(t); break;
        default: t->number = any_number(); break;
        }
    }

    // An operator that needs a payload which cannot be had becomes one that needs none.
    void fill_field(IC_NODE* t) {
        if (members.empty()) {
            t->op = 0;
            return;
        }
        TYPE* const structure = any(members)->real;
        std::vector<fkMDATA*> list;
        for (const fkMDATA* m = structure->mdata(); m; m = m->next) list.push_back(const_cast<fkMDATA*>(m));
        t->mk_field(1, any(list), structure);
    }

    static bool has_payload(int op) {
        using namespace if_op;
        static constexpr int with[] = {LABEL, NAME, SCON, ICON,   FCON,  LCON,   FIELD, SWITCH, CALL,
                                       UCALL, EPVAL, SKIP, DDNODE, ICALL, UICALL, MCALL, UMCALL, VREG};
        return std::count(std::begin(with), std::end(with), op) != 0;
    }

    void give_operator(IC_NODE* t, int op) {
        const int count = if_node_info[op].operand_count;
        if (count < 2) t->right = nullptr;
        if (count < 1) t->left = nullptr;
        if (count >= 1 && !t->left) t->left = any_tree();
        if (count >= 2 && !t->right) t->right = any_tree();
        const int before = t->op;
        t->op = op;
        if (has_payload(before) || has_payload(op)) fill(t);
    }

    void change_operator(IC_NODE* t) {
        const int wanted = one_in(4) ? static_cast<int>(below(3)) : (t->left != nullptr) + (t->right != nullptr);
        std::vector<int> fitting;
        for (int op = 0; op <= IF_MAX_OPCODE; ++op)
            if (if_node_info[op].name && if_node_info[op].operand_count == wanted) fitting.push_back(op);
        if (!fitting.empty()) give_operator(t, any(fitting));
    }

    void change_tree() {
        if (places.empty()) return;
        IC_NODE** const at = places[below(places.size())];
        IC_NODE* const t = *at;
        switch (below(10)) {
        case 0:
        case 1:
        case 2: return change_operator(t);
        case 3:
        case 4: t->type = any_type(); return;
        case 5: *at = any_tree(); return;
        case 6: std::swap(t->left, t->right); return; // one operand moves to the other side
        case 7:
            if (t->left) *at = one_in(2) && t->right ? t->right : t->left;
            return;
        case 8:
            if (t->op == 70 || t->op == 72)
                t->number2 = any_number();
            else
                t->number = any_number();
            if (t->op == 3) fill(t);
            return;
        default:
            if (has_payload(t->op)) fill(t);
            return;
        }
    }

    // ---- Types, in place: the types made of them keep their sizes, as in a file that somebody put together
    void change_type() {
        TYPE* const t = any(types)->real;
        fkMDATA* m = members.empty() ? nullptr : const_cast<fkMDATA*>(any(members)->real->mdata());
        for (uint64_t skip = below(6); m && m->next && skip > 0; --skip) m = m->next;
        switch (below(m ? 7 : 3)) {
        case 0: t->size = one_in(2) ? below(9) * 16 : static_cast<uint64_t>(any_value()) & UINT32_MAX; return;
        case 1: t->align = one_in(2) ? 1u << below(8) : any_number(); return;
        case 2: // another name and layout for what only looks at kinds
            t->size = any(types)->size;
            return;
        case 3: m->offset = static_cast<int32_t>(one_in(2) ? static_cast<int64_t>(below(100)) : any_value()); return;
        case 4: m->width = any_number(); return;
        case 5: m->is_bitfld = !m->is_bitfld; return;
        default:
            if (TYPE* other = any_type()) m->type = other;
            return;
        }
    }

    // ---- Symbols
    void change_symbol() {
        IC_SYMBOL* const s = any(symbols);
        if (!s) return;
        switch (below(11)) {
        case 0: s->type = any_type(); return;
        case 1: s->sclass = static_cast<int8_t>(below(28)); return;
        case 2: s->cqual = static_cast<uint16_t>(s->cqual ^ 1u << below(16)); return;
        case 3: s->size = one_in(2) ? below(200) : static_cast<uint64_t>(any_value()); return;
        case 4: s->align = one_in(2) ? 1u << below(8) : any_number(); return;
        case 5: s->value = any_number(); return;
        case 6: s->option_set = any_number(); return;
        case 7: s->retention = static_cast<I_SYMTAB::RETENTION_POLICY>(below(4)); return;
        case 8:
            if (const IC_SYMBOL* other = any_symbol()) s->name = other->name;
            return;
        case 9: s->psn = nullptr; return;
        default: s->add_pragma(any_pragma()); return;
        }
    }

    std::unique_ptr<PRAGMA> any_pragma() {
        auto pragma = std::make_unique<PRAGMA>();
        do
            pragma->kind = static_cast<uint8_t>(below(129));
        while (pragma->kind == 36); // refused at once
        for (uint64_t n = below(4); n > 0; --n) {
            const IC_SYMBOL* const named = any_symbol();
            pragma->args.push_back(one_in(2) || !named ? any_text() : named->name);
        }
        return pragma;
    }

    // ---- Records
    void change_records() {
        if (unit.items.empty()) return;
        const size_t at = below(unit.items.size()), other = below(unit.items.size());
        switch (below(8)) {
        case 0: unit.items.erase(unit.items.begin() + static_cast<long>(at)); return;
        case 1: {
            const IC_ITEM item = unit.items[at];
            unit.items.insert(unit.items.begin() + static_cast<long>(other), item);
            return;
        }
        case 2: std::swap(unit.items[at], unit.items[other]); return;
        case 3: {
            IC_ITEM item(one_in(2) ? IFR_BEGIN_BLOCK : IFR_END_BLOCK);
            unit.items.insert(unit.items.begin() + static_cast<long>(at), item);
            return;
        }
        case 4: {
            IC_ITEM item(IFR_LABEL);
            item.number = labels.empty() || one_in(2) ? any_number() : any(labels);
            unit.items.insert(unit.items.begin() + static_cast<long>(at), item);
            return;
        }
        case 5: {
            pragmas.push_back(any_pragma());
            IC_ITEM item(IFR_PRAGMA);
            item.pragma = pragmas.back().get();
            unit.items.insert(unit.items.begin() + static_cast<long>(at), item);
            return;
        }
        case 6: // a statement made of any tree
            if (!places.empty()) {
                IC_ITEM item(IFR_EXPR);
                item.tree = any_tree();
                unit.items.insert(unit.items.begin() + static_cast<long>(at), item);
            }
            return;
        default: return change_exceptions(unit.items[at]);
        }
    }

    void change_exceptions(IC_ITEM& item) {
        if (item.kind == IFR_LABEL) item.number = labels.empty() ? any_number() : any(labels);
        if (item.kind != IFR_EHT_HEADER || !item.number) return;
        EHT_ENTRY& e = item.eht[below(item.number)];
        switch (below(4)) {
        case 0: e.id = any_number(); return;
        case 1: e.next = any_number(); return;
        case 2:
            e.kind = any_number();
            if (e.kind == EHK_CLEANUP && !e.cleanup && !places.empty()) e.cleanup = any_tree();
            return;
        default:
            if (e.cleanup && !places.empty()) e.cleanup = any_tree();
            return;
        }
    }

    void change() {
        switch (below(9)) {
        case 0: return change_symbol();
        case 1: return change_records();
        case 2: return change_type();
        default: return change_tree();
        }
    }

    IC_UNIT& unit;
    std::mt19937_64 generator;
    std::vector<IC_NODE**> places; // of nodes, in bodies and initializers
    std::vector<TYPE*> types, members; // `members`: structures that have some
    std::vector<uint32_t> labels;
    std::vector<IC_SYMBOL*> symbols;
    std::vector<std::unique_ptr<PRAGMA>> pragmas; // of records of the body
};

} // namespace

int main(int argc, char** argv) {
    FILE* const in = argc == 4 ? std::fopen(argv[2], "rb") : nullptr;
    if (!in) {
        std::fprintf(stderr, "icmutate SEED IN OUT\n");
        return 1;
    }
    try {
        IC_UNIT unit;
        unit.read(in, ic_type_package());
        MUTATOR mutator(unit, std::strtoull(argv[1], nullptr, 0)); // holds what the unit names
        mutator.run();
        FILE* const out = std::fopen(argv[3], "wb");
        const bool failed = !out || unit.write(out, ic_type_package(), false) != 0;
        // What the writer itself refuses is no mutant.
        return failed;
    } catch (const std::exception& error) {
        std::fprintf(stderr, "icmutate: %s: %s\n", argv[2], error.what());
        return 1;
    }
}
