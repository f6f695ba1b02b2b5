// Small units made by hand and executed.
#pragma once

#include "tools/exec/exec.h"
#include "tools/model/ic_builder.h"

#include <gtest/gtest.h>

#include <cstdlib>

using namespace if_op; // operators by their codes in the file

class ExecTest : public testing::Test, protected IC_BUILDER {
protected:
    ExecTest() : IC_BUILDER(*ic_type_package()) {
        out = open_memstream(&bytes, &size);
        start(out, "unit.c");
        main_fn = function_type({}, pkg.int_t);
        main_sym = global("_main", main_fn);
        put_i64 = library("_put_i64", {pkg.llong_t}, pkg.void_t);
    }
    ~ExecTest() override { std::free(bytes); }

    // A function that the executor has.
    IC_SYMBOL* library(const char* name, const std::vector<TYPE*>& params, TYPE* result) {
        return global(name, function_type(params, result), 5);
    }
    IC_SYMBOL* parameter(const char* name, TYPE* type) {
        IC_SYMBOL* s = symbol(name, type, 1);
        s->level = 1;
        file->if_enter_local(s);
        file->if_write_symbol(s);
        return s;
    }
    IC_NODE* name(IC_SYMBOL* s) {
        IC_NODE* n = node(NAME, s->type);
        n->sym = s;
        return n;
    }
    IC_NODE* num(int64_t v, TYPE* type) {
        const bool small = v >= INT32_MIN && v <= INT32_MAX;
        IC_NODE* n = node(small ? ICON : LCON, type);
        if (small)
            n->value = v;
        else
            n->text = arena.copy(std::to_string(v).c_str());
        return n;
    }
    IC_NODE* real(const char* text, TYPE* type) {
        IC_NODE* n = node(FCON, type);
        n->text = arena.copy(text);
        return n;
    }
    IC_NODE* text(const char* bytes, uint32_t length) {
        IC_NODE* n = node(SCON, pkg.mk_ptr(pkg.schar_t));
        n->text = arena.copy(bytes, length);
        n->number = length;
        return n;
    }
    IC_NODE* text(const char* bytes) { return text(bytes, static_cast<uint32_t>(std::strlen(bytes))); }
    IC_NODE* set(IC_SYMBOL* to, IC_NODE* value) { return node(ASG, to->type, name(to), value); }
    IC_NODE* list(const std::vector<IC_NODE*>& trees) {
        IC_NODE* all = nullptr;
        for (IC_NODE* t : trees) all = all ? node(COMMA, pkg.int_t, all, t) : t;
        return all;
    }
    // A structure of members from left to right; a member with a width is a bit-field.
    struct MEMBER {
        const char* name;
        TYPE* type;
        int32_t offset;
        uint32_t width;
    };
    TYPE* structure(const char* tag, uint64_t bits, const std::vector<MEMBER>& members) {
        TYPE* t = pkg.mk_struct(tag, bits, 32, false);
        fkMDATA* first = nullptr;
        for (auto m = members.rbegin(); m != members.rend(); ++m) {
            auto* data = new fkMDATA(m->name, m->type, 0, m->offset, m->width, false, m->width != 0, false, false);
            data->next = first;
            first = data;
        }
        pkg.set_mdata(t, first);
        pkg.type_frozen(t);
        return t;
    }
    IC_NODE* member(IC_NODE* of, TYPE* type, size_t index) {
        fkMDATA* m = type->mdata();
        while (index--) m = m->next;
        IC_NODE* field = node(FIELD, m->type);
        field->mk_field(1, m, type);
        return node(STDOT, m->type, of, field);
    }
    // Static contents; after the last function.
    void initialize(IC_SYMBOL* g, std::vector<IC_NODE*> items) {
        items.push_back(node(ENDINIT, pkg.int_t));
        g->init = items;
        file->if_write_init(g);
        for (IC_NODE* n : items) file->if_write_expr_node(n);
    }
    // main ends and all is run; what it prints is compared.
    void expect_output(const std::string& expected, EXEC_OPTIONS options = {}) {
        ret(0);
        end();
        const EXEC_RESULT r = run(options);
        EXPECT_FALSE(r.failed) << r.error;
        EXPECT_EQ(printed, expected);
    }
    IC_NODE* label(uint32_t n) {
        IC_NODE* t = node(LABEL, pkg.int_t);
        t->number = n;
        return t;
    }
    IC_NODE* call(IC_SYMBOL* f, IC_NODE* args) {
        return node(args ? CALL : UCALL, f->type->return_type(), node(UAND, pkg.mk_ptr(f->type), name(f)), args);
    }
    static EXEC_OPTIONS checked() {
        EXEC_OPTIONS options;
        options.check = true;
        return options;
    }
    std::vector<IC_NODE*> numbers(const std::vector<int64_t>& values, TYPE* type) {
        std::vector<IC_NODE*> trees;
        for (int64_t v : values) trees.push_back(num(v, type));
        return trees;
    }
    IC_NODE* built_in(int opcode, TYPE* type, const char* callee, const std::vector<IC_NODE*>& args) {
        IC_NODE* n = node(opcode, type, args.empty() ? nullptr : list(args));
        n->text = callee;
        return n;
    }
    void begin(IC_SYMBOL* f) { file->if_write_begin_func(f, &psn), file->if_write_end_args(&psn); }
    void begin_main() { begin(main_sym), body(); }
    void body() { file->if_write_end_locals(&psn); }
    void statement(IC_NODE* tree) {
        ++psn.line;
        file->if_write_expr(tree, &psn);
    }
    void put(IC_NODE* value) { statement(call(put_i64, node(SCONV, pkg.llong_t, value))); }
    void ret(int64_t v) { statement(node(RETURN, pkg.int_t, name(main_sym), num(v, pkg.int_t))); }
    void end() { file->if_write_end_func(&psn); }

    EXEC_RESULT run(EXEC_OPTIONS options = {}) {
        EXPECT_EQ(I_FILE::if_close(file, true, false), 0);
        IC_UNIT unit;
        unit.read(fmemopen(bytes, size, "rb"), &pkg);
        char* text = nullptr;
        size_t length = 0;
        FILE* to = open_memstream(&text, &length);
        options.max_memory = 1 << 16;
        const EXEC_RESULT r = execute(unit, options, to, stderr);
        std::fclose(to);
        printed.assign(text, length);
        std::free(text);
        return r;
    }
    // main is closed; the unit ends with this status and a message that holds the text.
    void expect_error(int status, const char* text, EXEC_OPTIONS options = {}) {
        end();
        const EXEC_RESULT r = run(options);
        EXPECT_TRUE(r.failed);
        EXPECT_EQ(r.status, status) << r.error;
        EXPECT_NE(r.error.find(text), std::string::npos) << r.error;
        EXPECT_NE(r.error.find("in main, line"), std::string::npos) << r.error;
    }

    char* bytes = nullptr;
    size_t size = 0;
    FILE* out = nullptr;
    IC_SYMBOL *main_sym, *put_i64;
    TYPE* main_fn = nullptr;
    PSN psn{"unit.c", 0, 1};
    std::string printed;
};
