// A symbol as the I-file layer sees it.
#pragma once

#include "IFILE/pragma.h"
#include "UTIL/psn.h"

#include <cstdint>

class TYPE;

class I_SYMTAB {
public:
    enum RETENTION_POLICY : uint8_t { RETENTION_BY_USE = 0, RETENTION_KEEP = 1, RETENTION_2 = 2, RETENTION_DROP = 3 };

    int32_t index = -1; // place in the I-file's vector of globals or locals; -1 until entered
    RETENTION_POLICY retention = RETENTION_BY_USE;

    virtual const char* sym_name() const = 0;
    virtual uint64_t sym_size() const = 0; // bits
    virtual uint32_t sym_value() const = 0;
    virtual int sym_class() const = 0;
    virtual uint16_t sym_cqual() const = 0;
    virtual TYPE* sym_type() const = 0;
    virtual TYPE* sym_cpp_type() const = 0; // may be null
    virtual uint32_t sym_align() const = 0; // bits
    virtual PSN* sym_psn() const = 0;
    virtual PRAGMA* sym_pragma() const = 0;
    virtual int sym_prag_num() const = 0;
    virtual uint32_t sym_location() const = 0;
    virtual uint32_t sym_option_set() const = 0;
    virtual int sym_level() const = 0;
    virtual void set_level(int level) = 0;
    virtual void set_location(uint32_t location) = 0;
    virtual bool is_aliased() const = 0;
    virtual int bitnum() const = 0;
    virtual int64_t depnum() const = 0;
    virtual void set_is_aliased(bool aliased) = 0;
    virtual void set_bitnum(int number) = 0;
    virtual void inc_bitnum() = 0;
    virtual void set_depnum(int64_t number) = 0;
    virtual void inc_depnum() = 0;
    virtual ~I_SYMTAB() = default;
};
