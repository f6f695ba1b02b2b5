// What the tests of the I-file layer share: units in memory, and files built byte by byte.
#pragma once

#include "tools/model/ic_model.h"

#include <cstdlib>
#include <gtest/gtest.h>
#include <string>
#include <vector>

// A type package of its own, with the model of one unit.
struct WORLD {
    TYPE_PKG pkg;
    IC_UNIT unit;

    WORLD() {
        tp = &pkg;
        TYPE_PKG::init_type_pkg(&pkg);
    }
    void read(const std::string& bytes) {
        text_m = bytes;
        unit.read(open(), &pkg);
    }
    // The text of the error that reading ends with; empty if there is none.
    std::string read_error(const std::string& bytes) {
        try {
            read(bytes);
        } catch (const if_error& error) {
            offset = error.offset();
            return error.what();
        }
        return "";
    }
    std::string write() {
        char* bytes = nullptr;
        size_t size = 0;
        EXPECT_EQ(unit.write(open_memstream(&bytes, &size), &pkg, false), 0);
        std::string text(bytes, size);
        std::free(bytes);
        return text;
    }
    FILE* open() {
        return text_m.empty() ? std::fopen("/dev/null", "rb") : fmemopen(text_m.data(), text_m.size(), "rb");
    }

    IC_NODE* node(int op, TYPE* type, IC_NODE* left = nullptr, IC_NODE* right = nullptr) {
        auto* n = static_cast<IC_NODE*>(unit.new_node(op, type));
        n->left = left;
        n->right = right;
        return n;
    }
    long offset = -1;

private:
    std::string text_m;
};

// ---- Encodings, written down here independently of the layer under test

inline std::string by(std::initializer_list<int> bytes) {
    std::string text;
    for (int b : bytes) text += static_cast<char>(b);
    return text;
}
inline std::string un(uint64_t v) {
    std::string text;
    for (; v > 127; v /= 128) text += static_cast<char>(v % 128 + 128);
    return text + static_cast<char>(v);
}
inline std::string little(uint64_t v, int bytes) {
    std::string text;
    for (; bytes--; v >>= 8) text += static_cast<char>(v);
    return text;
}
inline std::string str(const std::string& text) { return text + '\0'; }
inline std::string rec(int kind, const std::string& payload) { return by({kind}) + un(payload.size()) + payload; }
inline std::string type_rec(uint64_t n, int tag, const std::string& fields) {
    return rec(IFR_TYPE, un(n) + by({tag}) + fields);
}
inline std::string list(uint64_t n, int number, const std::string& elements) {
    return type_rec(n, 254, by({number})) + elements + type_rec(n, 255, by({number}));
}
inline std::string node(int op, uint64_t type, const std::string& rest = "") {
    return rec(IFR_NODE, by({op}) + un(type) + rest);
}
const std::string no_psn(1, '\0');

// A file in the making. It starts with int (type 1), a function without arguments (2), the function f (global 0) and
// the int v (global 1); `statements` are the body of f.
struct FILE_BUILDER {
    int version = -71;
    int cpu = 600;
    std::string magic = "!<icode>\n";
    std::string options, inits, types, files, globals, statements;
    std::string body; // instead of f, if it is not empty
    std::string tail; // behind the header's last field

    FILE_BUILDER(int file_version = -71) : version(file_version) {
        types = type_rec(1, 6, by({0, 16, 16, 0, 0})) + type_rec(2, 20, by({1, 0, 1, 0, 0})) + list(2, 0, "");
        globals = symbol("_f", 2) + symbol("_v", 1);
    }
    std::string symbol(const std::string& name, uint64_t type, int pragmas = 0, int retention = 0, uint64_t size = 16,
                       uint64_t align = 16) const {
        std::string payload = str(name) + by({static_cast<int>(size), 0, 2}) + little(0, 2) + un(type) + un(0) +
                              un(align) + by({pragmas, 0, 0}) + no_psn;
        if (version >= -71) payload += by({retention});
        return rec(IFR_SYMBOL, payload);
    }
    static std::string function(const std::string& statements, int global = 0) {
        return rec(IFR_BEGIN_FUNC, no_psn + un(global)) + rec(IFR_END_ARGS, no_psn) + rec(IFR_END_LOCALS, no_psn) +
               statements + rec(IFR_END_FUNC, no_psn);
    }
    static std::string expr(const std::string& nodes) { return rec(IFR_EXPR, no_psn) + nodes; }

    std::string header(const size_t* offsets) const {
        std::string payload = str(magic) + little(version, 2) + little(cpu, 2);
        for (int i = 0; i < 5; i++) payload += little(offsets[i], 4);
        payload += str("t.c");
        if (version >= -83) payload += little(7, 4);
        return rec(IFR_HEADER, payload + tail);
    }
    std::string build() const {
        size_t offsets[5] = {};
        std::string text = header(offsets);
        text += body.empty() ? function(statements) : body;
        if (!inits.empty()) {
            text += '\xFF';
            offsets[1] = text.size();
            text += inits;
        }
        text += '\xFF';
        const std::string* sections[] = {&options, nullptr, &types, &files, &globals};
        for (int i : {0, 2, 3, 4}) {
            if (sections[i]->empty() && i != 4) continue;
            offsets[i] = text.size();
            text += *sections[i] + '\xFF';
        }
        return header(offsets) + text.substr(header(offsets).size());
    }
};
