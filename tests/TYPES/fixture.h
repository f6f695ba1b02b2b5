#pragma once

#include "TYPES/type.h"

#include <algorithm>
#include <gtest/gtest.h>

// A type package of its own for each test, with the wide ABI.
class Types : public testing::Test {
protected:
    explicit Types(int abi = 1) {
        TYPE_PKG::abi = abi;
        TYPE_PKG::init_type_pkg(&pkg);
    }

    static fkMDATA* member(const char* name, TYPE* type, int32_t offset, fkMDATA* next = nullptr) {
        auto* m = new fkMDATA(name, type, 0, offset, 0, false, false, false, false);
        m->next = next;
        return m;
    }
    static fkPARAM* param(TYPE* type, fkPARAM* next = nullptr) {
        auto* p = new fkPARAM;
        p->type = type;
        p->next = next;
        return p;
    }
    TYPE* structure(const char* name, fkMDATA* members, uint64_t size = 32) {
        TYPE* t = pkg.mk_struct(name, size, 32, false);
        pkg.set_mdata(t, members);
        pkg.type_frozen(t);
        return t;
    }
    TYPE* function(TYPE* ret, fkPARAM* params, bool cpp = false) {
        TYPE* t = pkg.mk_func(ret, cpp, false, true, 0, 0, 0);
        pkg.set_params(t, params);
        pkg.type_frozen(t);
        return t;
    }
    // A list node: struct NAME { struct NAME *next; int v; }, open until its members are there.
    TYPE* self_referring(const char* name) {
        TYPE* t = pkg.mk_struct(name, 64, 32, false);
        pkg.set_mdata(t, member("next", pkg.mk_ptr(t), 0, member("v", pkg.int_t, 32)));
        pkg.type_frozen(t);
        return t;
    }

    TYPE_PKG pkg;
};

#define EXPECT_DIES(statement, message)                                                                                \
    try {                                                                                                              \
        statement;                                                                                                     \
        ADD_FAILURE() << "lives";                                                                                      \
    } catch (const tp_failure& f) {                                                                                    \
        EXPECT_EQ(f.text(), message);                                                                                  \
    }
