// Writing loops, dependences, load speculation, and the exception table.
#include "IFILE/if_writer.h"

#include "UTIL/abort.h"

void I_FILE::if_write_loop(uint32_t id, uint32_t outer, uint32_t min, uint32_t max, uint32_t factor, uint16_t flags) {
    begin_payload();
    for (uint32_t word : {id, outer, min, max, factor}) i_write_uint(word);
    i_write_i16(flags);
    i_flush(IFR_LOOP);
}

void I_FILE::if_write_inloop(uint32_t id, I_SYMTAB* sym, uint8_t flags) {
    begin_payload();
    i_write_uint(id);
    i_write_sint(sym ? sym->sym_level() : -1);
    i_write_sint(sym ? sym->index : -1);
    i_write_i8(sym ? flags : 0);
    i_flush(IFR_LOOP_VAR);
}

void I_FILE::if_write_dep_vector(const DD_ENTRY* elements, uint32_t id, uint8_t flags, uint32_t count) {
    if (count > UINT8_MAX) {
        std::fprintf(stderr, "\n\n   !!! DDVECT too big:  %d elements !!!\n", static_cast<int>(count));
        abort_optimizer();
    }
    begin_payload();
    i_write_uint(id);
    i_write_i8(flags);
    i_write_i8(static_cast<int>(count));
    for (uint32_t i = 0; i < count; i++) {
        i_write_i8(elements[i].direction);
        i_write_i8(elements[i].distance);
    }
    i_flush(IFR_DEP_VECTOR);
}

void I_FILE::if_write_dep_edge(uint32_t from, uint32_t to, uint32_t vector) {
    begin_payload();
    for (uint32_t word : {from, to, vector}) i_write_uint(word);
    i_flush(IFR_DEP_EDGE);
}

void I_FILE::if_write_mbank(uint32_t a, uint32_t b, uint32_t c, uint32_t d, uint32_t e) {
    begin_payload();
    for (uint32_t word : {a, b, c, d, e}) i_write_uint(word);
    i_flush(IFR_MBANK);
}

void I_FILE::begin_ldspec(uint32_t id, int subkind) {
    begin_payload();
    i_write_uint(id);
    i_write_i8(subkind);
}

// The tail that the induct and rand forms share.
void I_FILE::end_ldspec(TYPE* type, I_SYMTAB* sym) {
    i_write_typeref(type);
    i_write_sint(sym ? sym->sym_level() : -1);
    i_write_uint(sym ? static_cast<uint32_t>(sym->index) : 0);
    i_flush(IFR_LDSPEC);
}

void I_FILE::if_write_ldspec_induct(uint32_t id, uint32_t word, int32_t step, TYPE* type, I_SYMTAB* sym) {
    begin_ldspec(id, 0);
    i_write_uint(word);
    i_write_sint(step);
    end_ldspec(type, sym);
}

void I_FILE::if_write_ldspec_rand(uint32_t id, uint32_t word, uint32_t word2, TYPE* type, I_SYMTAB* sym) {
    begin_ldspec(id, 1);
    i_write_uint(word);
    i_write_uint(word2);
    end_ldspec(type, sym);
}

void I_FILE::if_write_ldspec_region(uint32_t id, uint32_t label) {
    begin_ldspec(id, 2);
    i_write_uint(label);
    i_flush(IFR_LDSPEC);
}

// ---- Exception table

void I_FILE::if_write_eht_hdr(uint32_t count) {
    begin_payload();
    i_write_uint(count);
    i_flush(IFR_EHT_HEADER);
}

void I_FILE::if_write_eht_catch_entry(const I_CATCH_ENTRY& clause) {
    i_write_string(clause.type_name.c_str(), 0);
    i_write_uint(clause.label);
    i_write_bool(clause.flag);
}

void I_FILE::if_write_eht_entry(const EHT_ENTRY& entry) {
    bool has_catches = entry.kind == EHK_CATCH;
    begin_payload();
    i_write_uint(entry.id);
    i_write_uint(entry.kind);
    i_write_uint(entry.next);
    i_write_uint(has_catches ? entry.catches.size() : 0);
    i_flush(IFR_EHT_ENTRY);
    if (entry.kind == EHK_CLEANUP) {
        OPT_ASSERT(entry.cleanup != nullptr);
        if_write_expr(entry.cleanup, nullptr);
    } else if (has_catches) {
        begin_payload();
        for (const I_CATCH_ENTRY& clause : entry.catches) if_write_eht_catch_entry(clause);
        i_flush(IFR_CATCH_LIST);
    }
}

void I_FILE::if_write_func_eht(const EHT_ENTRY* entries, uint32_t count) {
    if_write_eht_hdr(count);
    for (uint32_t i = 0; i < count; i++) if_write_eht_entry(entries[i]);
}
