// The reader's primitives, inline for the record readers of this room. Not for users of I_FILE.
//
// `cursor` stands behind what was read last and never passes `limit`, the end of the record's payload, which itself
// lies inside the image. So no read can leave the file, whatever the bytes say.
#pragma once

#include "IFILE/ifile.h"

#include <cstring>

inline uint8_t I_FILE::i_read_u8() {
    if (cursor == limit) short_payload();
    return *cursor++;
}

inline int8_t I_FILE::i_read_s8() { return static_cast<int8_t>(i_read_u8()); }

inline bool I_FILE::i_read_bool() { return i_read_u8() != 0; }

inline uint64_t I_FILE::i_read_uint() {
    if (cursor != limit && *cursor < 0x80) return *cursor++;
    return i_read_long_uint();
}

inline const uint8_t* I_FILE::i_read_raw(uint64_t size) {
    if (size > rest()) short_payload();
    const uint8_t* bytes = cursor;
    cursor += size;
    return bytes;
}

inline int I_FILE::i_read_header() {
    record = cursor;
    limit = image_end;
    int kind = i_read_u8();
    if (kind == IFR_END) {
        limit = cursor;
        return kind;
    }
    uint64_t size = i_read_uint();
    if (size > rest()) bad_input("record of kind %d (%s) runs past the end of the file", kind, if_record_name(kind));
    limit = cursor + size;
    return kind;
}

inline void I_FILE::end_record() {
    if (cursor != limit)
        bad_input("record of kind %d (%s): its payload ends %ld bytes before its frame", *record,
                  if_record_name(*record), static_cast<long>(limit - cursor));
}

// The type package refuses what no correct program can mean; in a file that is a fault of the file.
template <class WORK>
void I_FILE::guard_types(WORK work) {
    try {
        work();
    } catch (const tp_failure& failure) {
        throw if_error(failure.what(), record - image.get());
    }
}

// One section of the file: stands at its start, gives its records one by one, and returns to where the reader was.
class I_FILE::SECTION {
public:
    SECTION(I_FILE& file, int64_t offset, const char* name) : file_m(file), back_m(file.cursor), name_m(name) {
        file.if_seek(offset);
    }
    ~SECTION() { file_m.cursor = back_m; }
    SECTION(const SECTION&) = delete;
    SECTION& operator=(const SECTION&) = delete;

    // False at the end marker. A record of another kind than `wanted` ends the reading.
    bool next(int wanted) {
        int kind = file_m.i_read_header();
        if (kind == IFR_END) return false;
        if (kind != wanted)
            file_m.bad_input("record of kind %d (%s) in the %s section", kind, if_record_name(kind), name_m);
        return true;
    }

private:
    I_FILE& file_m;
    const uint8_t* back_m;
    const char* name_m;
};
