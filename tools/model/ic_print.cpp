// The listing of a whole unit.
#include "tools/model/ic_print.h"

namespace {
class LISTING {
public:
    LISTING(FILE* out, const IC_UNIT& unit, const IC_PRINT_OPTIONS& options)
        : out_m(out), unit_m(unit), options_m(options) {}
    void unit();

private:
    void header();
    void types();
    void user_type(const TYPE* type);
    void symbol(size_t index, const IC_SYMBOL& sym);
    void pragma(const PRAGMA& pragma);
    void position(const PSN* psn);
    void body();
    void item(const IC_ITEM& item, size_t local);
    void facts(int kind, const IC_FACTS& facts);
    void exception_table(const IC_ITEM& item);
    std::string expr(const IC_NODE* tree) const { return tree ? ic_expr_text(tree, options_m) : "(no tree)"; }

    FILE* out_m;
    const IC_UNIT& unit_m;
    const IC_PRINT_OPTIONS& options_m;
};

void LISTING::position(const PSN* psn) {
    if (psn)
        std::fprintf(out_m, "%s:%ld:%ld", psn->file ? psn->file : "?", psn->line, psn->column);
    else
        std::fputs("-", out_m);
}

void LISTING::pragma(const PRAGMA& p) {
    std::fprintf(out_m, "pragma %u %s(", p.kind, p.name());
    for (size_t i = 0; i < p.args.size(); i++) std::fprintf(out_m, "%s\"%s\"", i ? ", " : "", p.args[i].c_str());
    std::fputs(")\n", out_m);
}

void LISTING::header() {
    const I_FILE& f = *unit_m.file();
    std::fprintf(out_m, "header: version %d, cpu %d, source \"%s\", extra word %ld\n", unit_m.version, unit_m.cpu,
                 unit_m.source.c_str(), static_cast<long>(f.extra_word));
    std::fprintf(out_m, "sections: options 0x%lx, initializers 0x%lx, types 0x%lx, files 0x%lx, globals 0x%lx\n",
                 static_cast<long>(f.off_options), static_cast<long>(f.off_inits), static_cast<long>(f.off_types),
                 static_cast<long>(f.off_files), static_cast<long>(f.off_globals));
    for (const OPTION_SET& set : unit_m.option_sets) {
        std::fprintf(out_m, "options %u:", set.id);
        for (const std::string& option : set.options) std::fprintf(out_m, " %s", option.c_str());
        std::fputc('\n', out_m);
    }
    for (uint32_t i = 1; const char* name = f.i_get_file_name(i); i++) std::fprintf(out_m, "file %u: %s\n", i, name);
}

// ---- Types

void LISTING::user_type(const TYPE* type) {
    if (type->kind == TYPE::tpk_typedef) {
        std::fprintf(out_m, "typedef %s = %s\n", type->name().c_str(), type->type_named()->printstr().c_str());
        return;
    }
    std::fprintf(out_m, "%s: %lu bits, aligned to %u%s\n", type->printstr().c_str(),
                 static_cast<unsigned long>(type->size), type->align, type->is_complete() ? "" : ", incomplete");
    if (type->is_enum()) {
        for (const fkETOR* e = type->etors(); e; e = e->next)
            std::fprintf(out_m, "    %s = %ld\n", e->name.c_str(), static_cast<long>(e->value));
        return;
    }
    for (const fkMDATA* m = type->mdata(); m; m = m->next) {
        std::fprintf(out_m, "    %u: %s %s at bit %d", m->ordinal, m->type->printstr().c_str(), m->name.c_str(),
                     m->offset);
        if (m->is_bitfld) std::fprintf(out_m, ", %u bits", m->width);
        std::fputc('\n', out_m);
    }
    if (const CSU_EXTRAS* x = type->csu_extras()) {
        for (const fkBCLASS& b : x->base_classes.items)
            std::fprintf(out_m, "    base %s%s at %ld\n", b.is_virtual ? "virtual " : "", b.type->printstr().c_str(),
                         static_cast<long>(b.offset));
        for (const fkMFUNC& m : x->member_functions.items)
            std::fprintf(out_m, "    function %s: %s\n", m.name.c_str(), m.type->printstr().c_str());
        for (const fkSDATA& s : x->static_data.items)
            std::fprintf(out_m, "    static %s: %s\n", s.name.c_str(), s.type->printstr().c_str());
        for (const fkFFRIEND& f : x->friend_functions.items)
            std::fprintf(out_m, "    friend %s: %s\n", f.name.c_str(), f.type->printstr().c_str());
        for (const TYPE* t : x->friend_classes.items) std::fprintf(out_m, "    friend %s\n", t->printstr().c_str());
        for (const TYPE* t : x->nested_types.items) std::fprintf(out_m, "    nested %s\n", t->printstr().c_str());
        for (const fkADECL& a : x->access_decls.items) std::fprintf(out_m, "    access declaration %u\n", a.access);
        for (const fkPARAM& p : x->parameters.items)
            std::fprintf(out_m, "    parameter %s: %s\n", p.name.c_str(), p.type->printstr().c_str());
    }
}

void LISTING::types() {
    std::fputs("\ntypes:\n", out_m);
    for (const auto& [name, types] : TYPE_PKG::root_type->based)
        for (const TYPE* type : types)
            if (type->kind >= TYPE::tpk_enum && !type->equiv) user_type(type);
    // Typedefs hang off the types that they name.
    std::vector<const TYPE*> stack{TYPE_PKG::root_type};
    while (!stack.empty()) {
        const TYPE* type = stack.back();
        stack.pop_back();
        if (type->kind == TYPE::tpk_typedef) user_type(type);
        for (auto group = type->based.rbegin(); group != type->based.rend(); ++group)
            stack.insert(stack.end(), group->second.rbegin(), group->second.rend());
    }
}

// ---- Symbols

void LISTING::symbol(size_t index, const IC_SYMBOL& s) {
    std::fprintf(out_m, "%4zu %s: %s, class %d, qualifiers %04x, %lu bits aligned to %u", index, s.name,
                 s.type ? s.type->printstr().c_str() : "no type", s.sclass, s.cqual, static_cast<unsigned long>(s.size),
                 s.align);
    if (s.level) std::fprintf(out_m, ", level %d", s.level);
    if (s.value) std::fprintf(out_m, ", value %u", s.value);
    if (s.cpp_type && s.cpp_type != s.type) std::fprintf(out_m, ", declared %s", s.cpp_type->printstr().c_str());
    if (s.retention) std::fprintf(out_m, ", retention %d", s.retention);
    if (s.option_set) std::fprintf(out_m, ", option set %u", s.option_set);
    if (s.location) std::fprintf(out_m, ", at 0x%x", s.location);
    if (options_m.positions) {
        std::fputs(", ", out_m);
        position(s.psn);
    }
    std::fputc('\n', out_m);
    for (const auto& p : s.pragmas) {
        std::fputs("         ", out_m);
        pragma(*p);
    }
    for (const IC_NODE* tree : s.init)
        if (tree->op != if_op::ENDINIT) std::fprintf(out_m, "         = %s\n", expr(tree).c_str());
}

// ---- Body

void LISTING::facts(int kind, const IC_FACTS& f) {
    const uint32_t* w = f.word;
    const char* symbol = f.sym ? f.sym->name : "none";
    switch (kind) {
    case IFR_LOOP:
        std::fprintf(out_m, "loop %u in %u: %u to %u trips, a multiple of %u, flags %04x", w[0], w[1], w[2], w[3], w[4],
                     f.flags);
        break;
    case IFR_LOOP_VAR: std::fprintf(out_m, "loop %u counts with %s, flags %02x", w[0], symbol, f.flags); break;
    case IFR_DEP_VECTOR:
        std::fprintf(out_m, "dependence vector %u, flags %02x:", w[0], f.flags);
        for (DD_ENTRY e : f.elements) {
            std::fprintf(out_m, " %s%s%s", e.direction & 2 ? ">" : "", e.direction & 4 ? "=" : "",
                         e.direction & 8 ? "<" : "");
            if (e.direction & 1) std::fprintf(out_m, "%d", e.distance);
            if (e.direction & 16) std::fputs("(overflows)", out_m);
        }
        break;
    case IFR_DEP_EDGE: std::fprintf(out_m, "dependence %u -> %u by vector %u", w[0], w[1], w[2]); break;
    case IFR_MBANK: std::fprintf(out_m, "memory bank hint %u %u %u %u %u", w[0], w[1], w[2], w[3], w[4]); break;
    case IFR_LDSPEC:
        if (f.flags == 2)
            std::fprintf(out_m, "load speculation %u: region L%u", w[0], w[1]);
        else
            std::fprintf(out_m, "load speculation %u: %s %u %d, %s, %s", w[0], f.flags ? "random" : "induction", w[1],
                         static_cast<int32_t>(w[2]), f.type ? f.type->printstr().c_str() : "no type", symbol);
        break;
    }
    std::fputc('\n', out_m);
}

void LISTING::exception_table(const IC_ITEM& item) {
    static const char* const names[] = {"root", "cleanup", "catch", "cleanup end", "catch end", "throw terminate"};
    std::fprintf(out_m, "exception table of %u:\n", item.number);
    for (uint32_t i = 0; i < item.number; i++) {
        const EHT_ENTRY& e = item.eht[i];
        std::fprintf(out_m, "        %u: %s, next %u", e.id, names[e.kind], e.next);
        if (e.cleanup) std::fprintf(out_m, ": %s", expr(static_cast<const IC_NODE*>(e.cleanup)).c_str());
        for (const I_CATCH_ENTRY& c : e.catches)
            std::fprintf(out_m, ", catch (%s%s) goto L%u", c.type_name.c_str(), c.flag ? ", flag" : "", c.label);
        std::fputc('\n', out_m);
    }
}

void LISTING::item(const IC_ITEM& i, size_t local) {
    if (i.kind == IFR_LABEL) {
        std::fprintf(out_m, "  L%u:\n", i.number);
        return;
    }
    if (i.kind == IFR_SYMBOL) return symbol(local, *i.sym);
    std::fputs("    ", out_m);
    if (options_m.positions && (i.kind == IFR_EXPR || i.kind == IFR_ASM || i.psn)) {
        std::fputc('[', out_m);
        position(i.psn);
        std::fputs("] ", out_m);
    }
    switch (i.kind) {
    case IFR_EXPR: std::fprintf(out_m, "%s\n", expr(i.tree).c_str()); break;
    case IFR_ASM: std::fprintf(out_m, "asm \"%s\"\n", i.text); break;
    case IFR_COMMENT: std::fprintf(out_m, "// %s\n", i.text); break;
    case IFR_FILE_NAME: std::fprintf(out_m, "source %s\n", i.text); break;
    case IFR_FUNC_INFO: std::fprintf(out_m, "function info %u%s\n", i.number, i.number == 'L' ? " (leaf)" : ""); break;
    case IFR_PRAGMA: pragma(*i.pragma); break;
    case IFR_EHT_HEADER: exception_table(i); break;
    case IFR_LOOP:
    case IFR_LOOP_VAR:
    case IFR_DEP_VECTOR:
    case IFR_DEP_EDGE:
    case IFR_MBANK:
    case IFR_LDSPEC: facts(i.kind, *i.facts); break;
    default: std::fprintf(out_m, "%s\n", if_record_name(i.kind)); break;
    }
}

void LISTING::body() {
    size_t local = 0, first = 0;
    for (const IC_ITEM& i : unit_m.items) {
        const size_t at = static_cast<size_t>(&i - unit_m.items.data());
        if (i.kind == IFR_BEGIN_FUNC) {
            local = 0;
            first = at;
            std::fprintf(out_m, "\nfunction %s: %s", i.sym->name,
                         i.sym->type ? i.sym->type->printstr().c_str() : "no type");
            if (options_m.positions) {
                std::fputs(", ", out_m);
                position(i.psn);
            }
            std::fputc('\n', out_m);
            continue;
        }
        item(i, local);
        if (i.kind == IFR_SYMBOL) local++;
        if (i.kind == IFR_END_FUNC)
            for (const std::string& line : ic_dependence_words(unit_m, first, at)) std::fprintf(out_m, "%s\n", line.c_str());
    }
}

void LISTING::unit() {
    header();
    types();
    std::fputs("\nglobals:\n", out_m);
    for (size_t i = 0; i < unit_m.globals.size(); i++) symbol(i, *unit_m.globals[i]);
    body();
}
} // namespace

void ic_print_unit(FILE* out, const IC_UNIT& unit, const IC_PRINT_OPTIONS& options) {
    LISTING(out, unit, options).unit();
}
