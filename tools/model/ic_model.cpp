// The model as a reader's client, and how it is written into a file again.
#include "tools/model/ic_model.h"

#include <new>

// ---- Arena, nodes, symbols

void* IC_ARENA::take(size_t size) {
    constexpr size_t block_size = 1 << 18;
    size = (size + 7) & ~size_t{7};
    if (size > left_m) {
        left_m = size > block_size ? size : block_size;
        blocks_m.emplace_back(new char[left_m]);
        next_m = blocks_m.back().get();
    }
    char* place = next_m;
    next_m += size;
    left_m -= size;
    return place;
}

const char* IC_ARENA::copy(const char* bytes, size_t length) {
    char* text = static_cast<char*>(take(length + 1));
    std::memcpy(text, bytes, length);
    text[length] = 0;
    return text;
}

I_SYMTAB* IC_NODE::name_symbol() const { return sym; }

void IC_NODE::mk_name(I_SYMTAB* symbol) { sym = static_cast<IC_SYMBOL*>(symbol); }

void IC_SYMBOL::add_pragma(std::unique_ptr<PRAGMA> pragma) {
    if (!pragmas.empty()) pragmas.back()->next = pragma.get();
    pragmas.push_back(std::move(pragma));
}

TYPE_PKG* ic_type_package() {
    if (!tp) {
        tp = new TYPE_PKG();
        TYPE_PKG::init_type_pkg(tp);
    }
    return tp;
}

// ---- Reading

IC_UNIT::~IC_UNIT() {
    if (file_m) I_FILE::if_close(file_m, false, true);
}

void IC_UNIT::read(FILE* stream, TYPE_PKG* pkg) {
    std::string why;
    file_m = I_FILE::if_open(stream, this, &why);
    if (!file_m) throw if_error(why, 0);
    file_m->if_type_init(pkg);
    file_m->if_read_file();
    globals.clear();
    for (I_SYMTAB* sym : file_m->globals) globals.push_back(static_cast<IC_SYMBOL*>(sym));
}

IC_ITEM& IC_UNIT::add(int kind, PSN* psn) {
    items.emplace_back(kind, psn);
    return items.back();
}

IC_FACTS& IC_UNIT::add_facts(int kind, std::initializer_list<uint32_t> words, int flags) {
    facts_m.push_back(std::make_unique<IC_FACTS>());
    IC_FACTS& facts = *facts_m.back();
    size_t i = 0;
    for (uint32_t word : words) facts.word[i++] = word;
    facts.flags = flags;
    add(kind).facts = &facts;
    return facts;
}

// Outside a function of the unit there are no locals: those of back-end functions are passed over.
IC_SYMBOL* IC_UNIT::known(I_SYMTAB* sym) const {
    return sym && (function_m || sym->sym_level() == 0) ? static_cast<IC_SYMBOL*>(sym) : nullptr;
}

BASE_NODE* IC_UNIT::new_node(int op, TYPE* type) {
    IC_NODE* node = new (arena_m.take(sizeof(IC_NODE))) IC_NODE(&arena_m);
    node->op = op;
    node->type = type;
    return node;
}

bool IC_UNIT::cl_magic(int file_version, int cpu_id) {
    version = file_version;
    cpu = cpu_id;
    return true;
}

void IC_UNIT::cl_option_set(unsigned id, const std::vector<std::string>& options) {
    option_sets.push_back({id, options});
}

I_SYMTAB* IC_UNIT::cl_symbol_create(const char* name, TYPE* type, TYPE* second_type, uint64_t size, uint32_t align,
                                    uint32_t value, int sclass, uint16_t cqual, PSN* psn, uint32_t location,
                                    uint32_t option_set, I_SYMTAB::RETENTION_POLICY retention) {
    symbols_m.push_back(std::make_unique<IC_SYMBOL>());
    IC_SYMBOL* sym = symbols_m.back().get();
    sym->name = arena_m.copy(name);
    sym->type = type;
    sym->cpp_type = second_type;
    sym->size = size;
    sym->align = align;
    sym->value = value;
    sym->sclass = static_cast<int8_t>(sclass);
    sym->cqual = cqual;
    sym->psn = psn;
    sym->location = location;
    sym->option_set = option_set;
    sym->retention = retention;
    return sym;
}

void IC_UNIT::cl_pragma(I_SYMTAB* sym, PRAGMA* pragma) {
    std::unique_ptr<PRAGMA> owned(pragma);
    if (sym) return static_cast<IC_SYMBOL*>(sym)->add_pragma(std::move(owned));
    loose_pragmas_m.push_back(std::move(owned));
    add(IFR_PRAGMA).pragma = pragma;
}

void IC_UNIT::cl_symbol_init(I_SYMTAB* sym, std::vector<BASE_NODE*>& list) {
    std::vector<IC_NODE*>& init = static_cast<IC_SYMBOL*>(sym)->init;
    init.clear();
    for (BASE_NODE* tree : list) init.push_back(static_cast<IC_NODE*>(tree));
}

void IC_UNIT::cl_symbol_def(I_SYMTAB* sym) {
    if (!function_m) return; // a global; those stand in the I_FILE's vector
    function_m->locals.push_back(static_cast<IC_SYMBOL*>(sym));
    add(IFR_SYMBOL).sym = static_cast<IC_SYMBOL*>(sym);
}

void IC_UNIT::cl_expr(BASE_NODE* tree, PSN* psn) { add(IFR_EXPR, psn).tree = static_cast<IC_NODE*>(tree); }

void IC_UNIT::cl_begin_func(I_SYMTAB* sym, PSN* psn) {
    functions.emplace_back();
    function_m = &functions.back();
    function_m->sym = static_cast<IC_SYMBOL*>(sym);
    function_m->first = items.size();
    add(IFR_BEGIN_FUNC, psn).sym = function_m->sym;
}

void IC_UNIT::cl_end_func(PSN* psn) {
    if (!function_m) return; // of back-end records
    add(IFR_END_FUNC, psn);
    function_m->last = items.size() - 1;
    function_m = nullptr;
}

// The first name is the header's; later ones are records of the body.
void IC_UNIT::cl_source(const char* name) {
    if (body_started_m)
        add(IFR_FILE_NAME).text = arena_m.copy(name);
    else
        source = name;
}

bool IC_UNIT::cl_func_eht(EHT_ENTRY* entries, uint32_t count) {
    tables_m.emplace_back(entries);
    IC_ITEM& item = add(IFR_EHT_HEADER);
    item.number = count;
    item.eht = entries;
    return false;
}

void IC_UNIT::cl_loop_def(uint32_t id, uint32_t outer, uint32_t min, uint32_t max, uint32_t factor, uint16_t flags) {
    add_facts(IFR_LOOP, {id, outer, min, max, factor}, flags);
}

void IC_UNIT::cl_loop_header(uint32_t id, I_SYMTAB* lcv, uint8_t flags) {
    add_facts(IFR_LOOP_VAR, {id}, flags).sym = known(lcv);
}

void IC_UNIT::cl_dd_vector(uint32_t id, uint8_t flags, uint32_t count, const uint16_t* elements) {
    IC_FACTS& facts = add_facts(IFR_DEP_VECTOR, {id}, flags);
    for (uint32_t i = 0; i < count; i++)
        facts.elements.push_back({static_cast<uint8_t>(elements[i]), static_cast<int8_t>(elements[i] >> 8)});
}

void IC_UNIT::cl_dd_edge(uint32_t from, uint32_t to, uint32_t vector) { add_facts(IFR_DEP_EDGE, {from, to, vector}); }

void IC_UNIT::cl_mbank(uint32_t a, uint32_t b, uint32_t c, uint32_t d, uint32_t e) {
    add_facts(IFR_MBANK, {a, b, c, d, e});
}

void IC_UNIT::cl_ldspec_induct(uint32_t id, uint32_t word, int32_t step, TYPE* type, I_SYMTAB* sym) {
    IC_FACTS& facts = add_facts(IFR_LDSPEC, {id, word, static_cast<uint32_t>(step)}, 0);
    facts.type = type;
    facts.sym = known(sym);
}

void IC_UNIT::cl_ldspec_rand(uint32_t id, uint32_t word, uint32_t word2, TYPE* type, I_SYMTAB* sym) {
    IC_FACTS& facts = add_facts(IFR_LDSPEC, {id, word, word2}, 1);
    facts.type = type;
    facts.sym = known(sym);
}

void IC_UNIT::cl_ldspec_region(uint32_t id, uint32_t label) { add_facts(IFR_LDSPEC, {id, label}, 2); }

// ---- Writing

void IC_UNIT::write_facts(I_FILE* out, int kind, const IC_FACTS& f) {
    const uint32_t* w = f.word;
    switch (kind) {
    case IFR_LOOP: return out->if_write_loop(w[0], w[1], w[2], w[3], w[4], static_cast<uint16_t>(f.flags));
    case IFR_LOOP_VAR: return out->if_write_inloop(w[0], f.sym, static_cast<uint8_t>(f.flags));
    case IFR_DEP_VECTOR:
        return out->if_write_dep_vector(f.elements.data(), w[0], static_cast<uint8_t>(f.flags),
                                        static_cast<uint32_t>(f.elements.size()));
    case IFR_DEP_EDGE: return out->if_write_dep_edge(w[0], w[1], w[2]);
    case IFR_MBANK: return out->if_write_mbank(w[0], w[1], w[2], w[3], w[4]);
    case IFR_LDSPEC:
        if (f.flags == 0) return out->if_write_ldspec_induct(w[0], w[1], static_cast<int32_t>(w[2]), f.type, f.sym);
        if (f.flags == 1) return out->if_write_ldspec_rand(w[0], w[1], w[2], f.type, f.sym);
        return out->if_write_ldspec_region(w[0], w[1]);
    }
}

void IC_UNIT::write_item(I_FILE* out, const IC_ITEM& item) {
    switch (item.kind) {
    case IFR_BEGIN_FUNC: return out->if_write_begin_func(item.sym, item.psn);
    case IFR_SYMBOL: out->if_enter_local(item.sym); return out->if_write_symbol(item.sym);
    case IFR_EXPR: return out->if_write_expr(item.tree, item.psn);
    case IFR_LABEL: return out->if_write_label(item.number);
    case IFR_ASM: return out->if_write_assembly(item.text, item.psn);
    case IFR_COMMENT: return out->if_write_comment(item.text);
    case IFR_FILE_NAME: return out->if_write_source(item.text);
    case IFR_FUNC_INFO: return out->if_write_func_info(static_cast<uint8_t>(item.number));
    case IFR_PRAGMA: return out->if_write_pragma(item.pragma);
    case IFR_EHT_HEADER: return out->if_write_func_eht(item.eht, item.number);
    case IFR_LOOP:
    case IFR_LOOP_VAR:
    case IFR_DEP_VECTOR:
    case IFR_DEP_EDGE:
    case IFR_MBANK:
    case IFR_LDSPEC: return write_facts(out, item.kind, *item.facts);
    default: return out->if_write_control(item.kind, item.psn);
    }
}

int IC_UNIT::write(FILE* stream, TYPE_PKG* pkg, bool keep_all_types) {
    I_FILE* out = I_FILE::if_create(stream, pkg, source.c_str());
    if (file_m) out->extra_word = file_m->extra_word;
    for (const OPTION_SET& set : option_sets) out->if_enter_option_set(set);
    for (IC_SYMBOL* sym : globals) {
        sym->location = 0;
        out->if_enter_global(sym);
    }
    for (const IC_ITEM& item : items) write_item(out, item);
    for (IC_SYMBOL* sym : globals) {
        if (sym->init.empty()) continue;
        out->if_write_init(sym);
        for (const IC_NODE* tree : sym->init) out->if_write_expr_node(tree);
    }
    return I_FILE::if_close(out, keep_all_types, false);
}
