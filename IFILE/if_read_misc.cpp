// Loops, dependences, load speculation, and the function's exception table.
#include "IFILE/if_reader.h"

namespace {
constexpr char bad_eht[] = "\nINTERNAL ERROR: Invalid EHT record in I-code, aborting";
}

void I_FILE::if_read_loop() {
    uint32_t word[5]; // id, outer, minimum, maximum, factor
    for (uint32_t& w : word) w = static_cast<uint32_t>(i_read_uint());
    uint16_t flags = i_read_u16();
    end_record();
    client->cl_loop_def(word[0], word[1], word[2], word[3], word[4], flags);
}

// Level and index of a symbol, where level -1 stands for none. Loop variables have both signed.
I_SYMTAB* I_FILE::read_symbol_ref(const char* what) {
    int32_t symbol_level = static_cast<int32_t>(i_read_sint());
    int64_t index = static_cast<int32_t>(*record == IFR_LOOP_VAR ? i_read_sint() : static_cast<int64_t>(i_read_uint()));
    return find_symbol(symbol_level, static_cast<uint64_t>(index), what);
}

void I_FILE::if_read_inloop() {
    uint32_t id = static_cast<uint32_t>(i_read_uint());
    I_SYMTAB* sym = read_symbol_ref("loop variable");
    uint8_t flags = i_read_u8();
    end_record();
    client->cl_loop_header(id, sym, flags);
}

void I_FILE::if_read_dep_vector() {
    uint32_t id = static_cast<uint32_t>(i_read_uint());
    uint8_t flags = i_read_u8();
    uint32_t count = i_read_u8();
    uint16_t elements[255];
    for (uint32_t i = 0; i < count; i++) elements[i] = i_read_u16(); // direction low
    end_record();
    client->cl_dd_vector(id, flags, count, elements);
}

void I_FILE::if_read_dep_edge() {
    uint32_t word[3];
    for (uint32_t& w : word) w = static_cast<uint32_t>(i_read_uint());
    end_record();
    client->cl_dd_edge(word[0], word[1], word[2]);
}

void I_FILE::if_read_mbank() {
    uint32_t word[5];
    for (uint32_t& w : word) w = static_cast<uint32_t>(i_read_uint());
    end_record();
    client->cl_mbank(word[0], word[1], word[2], word[3], word[4]);
}

void I_FILE::if_read_ldspec() {
    uint32_t id = static_cast<uint32_t>(i_read_uint());
    unsigned subkind = i_read_u8();
    if (subkind == 2) {
        uint64_t label = i_read_uint();
        end_record();
        if (label > INT32_MAX)
            bad_input("load speculation region at label %llu", static_cast<unsigned long long>(label));
        return client->cl_ldspec_region(id, static_cast<uint32_t>(label));
    }
    if (subkind > 2) bad_input("load speculation of subkind %u", subkind);
    uint32_t word = static_cast<uint32_t>(i_read_uint());
    uint32_t word2 = static_cast<uint32_t>(subkind == 0 ? i_read_sint() : static_cast<int64_t>(i_read_uint()));
    TYPE* type = find_typeref(i_read_uint());
    I_SYMTAB* sym = read_symbol_ref("load speculation");
    end_record();
    if (subkind == 0)
        client->cl_ldspec_induct(id, word, static_cast<int32_t>(word2), type, sym);
    else
        client->cl_ldspec_rand(id, word, word2, type, sym);
}

// ---- Exception table

void I_FILE::if_read_eht_entry(EHT_ENTRY* entry, uint32_t table_size) {
    if (i_read_header() != IFR_EHT_ENTRY) bad_input("%s", bad_eht);
    entry->id = i_read_uint32("exception entry");
    entry->kind = i_read_uint32("kind of an exception entry");
    entry->next = i_read_uint32("next exception entry");
    entry->count = i_read_uint32("count of catch clauses");
    end_record();
    if (entry->kind > EHK_THROW_TERMINATE) bad_input("exception entry of kind %u", entry->kind);
    if (entry->id == EHT_ROOT_ID || entry->id > table_size || entry->next > table_size)
        bad_input("exception entry %u with next entry %u in a table of %u", entry->id, entry->next, table_size);
    if (entry->kind == EHK_CLEANUP) {
        if (i_read_header() != IFR_EXPR) bad_input("%s", bad_eht);
        i_read_psn();
        end_record();
        entry->cleanup = if_read_expr_node(true);
    } else if (entry->kind == EHK_CATCH) {
        if (i_read_header() != IFR_CATCH_LIST) bad_input("%s", bad_eht);
        if (entry->count > rest() / 3) bad_input("catch list too short for its %u clauses", entry->count);
        entry->catches.resize(entry->count);
        for (I_CATCH_ENTRY& clause : entry->catches) {
            clause.type_name = i_read_string();
            clause.label = static_cast<uint32_t>(i_read_uint());
            clause.flag = i_read_bool();
        }
        end_record();
    }
}

// Clients follow the chains of `next` to the root; each must get there.
void I_FILE::check_eht(const EHT_ENTRY* entries, uint32_t count) const {
    std::vector<uint32_t> next(count + 1), seen(count + 1);
    for (uint32_t i = 0; i < count; i++) {
        if (seen[entries[i].id]++) bad_input("two exception entries of id %u", entries[i].id);
        next[entries[i].id] = entries[i].next;
    }
    std::vector<uint32_t> walk(count + 1); // by entry: the walk that reached it first
    for (uint32_t start = 1; start <= count; start++) {
        uint32_t at = start;
        for (; at != EHT_ROOT_ID && !walk[at]; at = next[at]) walk[at] = start;
        if (at != EHT_ROOT_ID && walk[at] == start) bad_input("exception entry %u leads back to itself", at);
    }
}

void I_FILE::if_read_eht() {
    uint32_t count = i_read_uint32("number of exception entries");
    end_record();
    need_function("exception table");
    if (eht_count) bad_input("second exception table");
    // The smallest entry is a record of six bytes.
    if (count > static_cast<uint64_t>(image_end - cursor) / 6)
        bad_input("exception table of %u entries in a file too short for them", count);
    std::unique_ptr<EHT_ENTRY[]> entries(new EHT_ENTRY[count]);
    for (uint32_t i = 0; i < count; i++) if_read_eht_entry(&entries[i], count);
    check_eht(entries.get(), count);
    eht_count = count;
    EHT_ENTRY* passed = entries.release();
    if (client->cl_func_eht(passed, count)) delete[] passed;
}
