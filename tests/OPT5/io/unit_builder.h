// Small units made by hand, put through the whole tool in a process of its own, and looked at as the dump's text.
#pragma once

#include "run.h"

#include "tools/model/ic_builder.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

namespace op = if_op;

// Writes one unit; then `optimize` runs the tool on it and `dump` shows what came out.
class UnitTest : public testing::Test, protected IC_BUILDER {
protected:
    UnitTest() {
        out = open_memstream(&bytes, &size);
        start(out, "unit.c");
        int_fn = function_type({}, pkg.int_t);
    }
    ~UnitTest() override { std::free(bytes); }

    // ---- Types and symbols
    IC_SYMBOL* pragma(IC_SYMBOL* s, int kind, std::vector<std::string> args = {}) {
        auto p = std::make_unique<PRAGMA>();
        p->kind = static_cast<uint8_t>(kind);
        p->args = std::move(args);
        s->add_pragma(std::move(p));
        return s;
    }

    // ---- Functions
    void begin(IC_SYMBOL* f) { file->if_write_begin_func(f, &psn); }
    void end_args() { file->if_write_end_args(&psn); }
    void end_locals() { file->if_write_end_locals(&psn); }
    void end() { file->if_write_end_func(&psn); }
    // A function `int main(void)` with int locals x and y.
    void begin_main() {
        main_sym = global("_main", int_fn);
        begin(main_sym);
        end_args();
        x = local("x", pkg.int_t);
        y = local("y", pkg.int_t);
        end_locals();
    }
    void statement(IC_NODE* tree) {
        ++psn.line;
        file->if_write_expr(tree, &psn);
    }
    void label(uint32_t n) { file->if_write_label(n); }
    void go(uint32_t n) { statement(node(op::BRANCH, pkg.int_t, ref(n))); }
    void unless(IC_NODE* cond, uint32_t n) { statement(node(op::CBRANCH, pkg.int_t, cond, ref(n))); }
    void ret(IC_NODE* value) { statement(node(op::RETURN, pkg.int_t, name(main_sym), value)); }
    void set(IC_SYMBOL* s, IC_NODE* value) { statement(node(op::ASG, s->type, name(s), value)); }

    // ---- Trees
    IC_NODE* name(IC_SYMBOL* s) {
        IC_NODE* n = node(op::NAME, s->type);
        n->sym = s;
        return n;
    }
    IC_NODE* icon(long v, TYPE* type = nullptr) {
        IC_NODE* n = node(op::ICON, type ? type : pkg.int_t);
        n->value = v;
        return n;
    }
    IC_NODE* ref(uint32_t n) {
        IC_NODE* t = node(op::LABEL, pkg.int_t);
        t->number = n;
        return t;
    }
    IC_NODE* call(IC_SYMBOL* f, IC_NODE* args = nullptr, uint32_t eh_entry = 0) {
        TYPE* result = f->type->return_type();
        IC_NODE* n = node(args ? op::CALL : op::UCALL, result, node(op::UAND, pkg.mk_ptr(f->type), name(f)), args);
        n->number2 = eh_entry;
        return n;
    }
    IC_NODE* intrinsic(int opcode, const char* callee, TYPE* type, IC_NODE* args = nullptr) {
        IC_NODE* n = node(opcode, type, args);
        n->text = callee;
        return n;
    }

    // ---- The run
    RESULT optimize(std::vector<std::string> options = {}) {
        if (file) {
            EXPECT_EQ(I_FILE::if_close(file, true, false), 0);
            file = nullptr;
            place.put("unit.if", std::string(bytes, size));
        }
        options.insert(options.begin(), "--debug:validate");
        options.insert(options.end(), {"unit.if", "unit.opt"});
        return place.run(options);
    }
    // The dump of the output, lines without leading blanks.
    std::string dump() {
        const std::string text = capture(std::string(ICDUMP) + " " + place.dir + "/unit.opt");
        std::string lines;
        bool at_start = true;
        for (char c : text) {
            if (at_start && c == ' ') continue;
            at_start = c == '\n';
            lines += c;
        }
        return lines;
    }
    // Runs without optimization, or by these options; the dump of the output.
    std::string optimized(const std::vector<std::string>& options = {"--opt_level=off"}) {
        const RESULT r = optimize(options);
        EXPECT_EQ(r.status, 0) << r.err;
        return r.status == 0 ? dump() : "";
    }
    // The output of the last run, read by a type package of its own.
    IC_UNIT& read_back() {
        tp = &output_types;
        TYPE_PKG::init_type_pkg(tp);
        output.read(std::fopen((place.dir + "/unit.opt").c_str(), "rb"), tp);
        return output;
    }
    // Runs at a level and expects these lines one behind the other, with anything between.
    void expect_lines(const std::vector<std::string>& wanted,
                      const std::vector<std::string>& options = {"--opt_level=off"}) {
        const std::string text = optimized(options);
        size_t from = 0;
        for (const std::string& line : wanted) {
            const size_t at = text.find("\n" + line + "\n", from);
            ASSERT_NE(at, std::string::npos) << "no line '" << line << "' in\n" << text;
            from = at + line.size() + 1;
        }
    }
    void expect_no_line(const std::string& line) { EXPECT_EQ(dump().find(line), std::string::npos) << dump(); }
    // The input is refused with this text, and leaves nothing behind.
    void expect_refusal(const std::string& text) {
        const RESULT r = optimize();
        EXPECT_EQ(r.status, 1);
        EXPECT_NE(r.err.find(text), std::string::npos) << r.err;
        EXPECT_NE(r.err.find("offset 0x"), std::string::npos) << r.err;
        EXPECT_EQ(r.err.find("defect"), std::string::npos) << "bad input is no defect of the tool";
        EXPECT_FALSE(place.has("unit.opt"));
    }

    static std::string capture(const std::string& command) {
        std::string text;
        FILE* pipe = popen(command.c_str(), "r");
        char buffer[4096];
        for (size_t n; (n = fread(buffer, 1, sizeof buffer, pipe)) > 0;) text.append(buffer, n);
        EXPECT_EQ(pclose(pipe), 0) << command;
        return text;
    }

    char* bytes = nullptr;
    size_t size = 0;
    FILE* out;
    PSN psn{"unit.c", 1, 1};
    TYPE* int_fn;
    IC_SYMBOL *main_sym = nullptr, *x = nullptr, *y = nullptr;
    WORKPLACE place;
    TYPE_PKG output_types;
    IC_UNIT output;
};
