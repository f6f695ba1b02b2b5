// The program as a whole: the call graph, and what it lets be said of functions and globals.

#include "unit_builder.h"

namespace {

class ProgramTest : public UnitTest {
protected:
    // `int name(void)` of class 2 or 3 that returns `value`, behind these statements.
    IC_SYMBOL* declare(const char* text, int sclass = 3) { return global(text, int_fn, sclass); }
    void begin_body(IC_SYMBOL* f) {
        begin(f);
        end_args();
        end_locals();
    }
    void returns(IC_SYMBOL* f, IC_NODE* value) {
        begin_body(f);
        statement(node(op::RETURN, pkg.int_t, name(f), value));
        end();
    }
    // Initializers stand behind the functions.
    void initialize(IC_SYMBOL* s, IC_NODE* item) { initializers.emplace_back(s, item); }
    std::string info(std::vector<std::string> options) {
        for (auto& [s, item] : initializers) {
            file->if_write_init(s);
            file->if_write_expr_node(item);
            file->if_write_expr_node(node(op::ENDINIT, pkg.int_t));
        }
        options.push_back("--gen_opt_info=2");
        const RESULT r = optimize(options);
        EXPECT_EQ(r.status, 0) << r.err;
        return place.get("unit.nfo");
    }
    static int count(const std::string& text, const std::string& what) {
        int n = 0;
        for (size_t at = text.find(what); at != std::string::npos; at = text.find(what, at + 1)) ++n;
        return n;
    }
    IC_SYMBOL* initialized(const char* text, int sclass, long value, TYPE* type = nullptr) {
        IC_SYMBOL* s = global(text, type ? type : pkg.int_t, sclass);
        initialize(s, icon(value));
        return s;
    }
    std::vector<std::pair<IC_SYMBOL*, IC_NODE*>> initializers;
};

TEST_F(ProgramTest, AGlobalThatNothingWritesIsAConstant) {
    IC_SYMBOL* fixed = initialized("_fixed", 3, 7);
    IC_SYMBOL* written = initialized("_written", 3, 8);
    IC_SYMBOL* pointed = initialized("_pointed", 3, 9);
    IC_SYMBOL* visible = initialized("_visible", 2, 10);
    IC_SYMBOL* hidden = initialized("_in_assembly", 3, 11);
    IC_SYMBOL* port = initialized("_port", 3, 12, pkg.mk_qual(pkg.int_t, QUAL_VOLATILE));
    IC_SYMBOL* pointer = global("_pointer", pkg.mk_ptr(pkg.int_t), 2);
    begin_main();
    file->if_write_assembly("\tMOV @_in_assembly, AL", &psn);
    set(pointer, node(op::UAND, pkg.mk_ptr(pkg.int_t), name(pointed)));
    set(written, icon(1));
    IC_NODE* sum = name(fixed);
    for (IC_SYMBOL* s : {written, pointed, visible, hidden, port}) sum = node(op::PLUS, pkg.int_t, sum, name(s));
    ret(sum);
    end();
    const std::string text = info({"--opt_level=3"});
    EXPECT_NE(text.find("\nMaking unmodified global variable CONST:\n\t_fixed = 7\n"), std::string::npos) << text;
    EXPECT_EQ(count(text, "Making unmodified"), 1) << text;
    const std::string out_text = dump();
    EXPECT_EQ(count(out_text.substr(out_text.find("function _main")), "_fixed"), 0) << "its value stands in its place\n"
                                                                                    << out_text;
    for (const char* s : {"_pointed", "_visible", "_in_assembly", "_port"})
        EXPECT_GE(count(out_text.substr(out_text.find("function _main")), s), 1) << s << "\n" << out_text;
}

TEST_F(ProgramTest, WhatNothingCallsIsNotCompiledUnlessItsAddressIsKnown) {
    IC_SYMBOL* idle = declare("_idle");
    IC_SYMBOL* addressed = declare("_addressed");
    IC_SYMBOL* in_assembly = declare("_in_assembly");
    IC_SYMBOL* outer = declare("_outer", 2);
    IC_SYMBOL* table = global("_table", pkg.mk_ptr(int_fn), 2);
    initialize(table, node(op::UAND, pkg.mk_ptr(int_fn), name(addressed)));
    for (IC_SYMBOL* f : {idle, addressed, in_assembly, outer}) returns(f, icon(1));
    begin_main();
    file->if_write_assembly("\tLCR #_in_assembly", &psn);
    ret(icon(0));
    end();
    const std::string text = info({"--opt_level=3"});
    EXPECT_NE(text.find("\n>>>> WARNING - Function _idle() is not called and will not be compiled\n"), std::string::npos)
        << text;
    EXPECT_EQ(count(text, "will not be compiled"), 1) << text;
    const std::string out_text = dump();
    EXPECT_EQ(count(out_text, "function _idle"), 0) << out_text;
    for (const char* f : {"function _addressed", "function _in_assembly", "function _outer", "function _main"})
        EXPECT_EQ(count(out_text, f), 1) << f << "\n" << out_text;
}

// A pragma of the symbol says as well as the symbol's record that somebody outside needs it; a synonym needs its target.
TEST_F(ProgramTest, WhatPragmasKeepIsCompiled) {
    constexpr int EXT_CALLED = 23, IS_REFERENCED = 52, SYNONYM = 78;
    IC_SYMBOL* idle = declare("_idle", 2);
    IC_SYMBOL* target = declare("_target");
    std::vector<IC_SYMBOL*> kept = {pragma(declare("_called"), EXT_CALLED), pragma(declare("_referenced"), IS_REFERENCED),
                                    pragma(declare("_outer", 2), IS_REFERENCED),
                                    pragma(declare("_other_name"), SYNONYM, {"target"})};
    pragma(kept.back(), IS_REFERENCED);
    IC_SYMBOL* object = pragma(initialized("_object", 3, 7), IS_REFERENCED);
    returns(idle, icon(1));
    returns(target, icon(1));
    for (IC_SYMBOL* f : kept) returns(f, icon(1));
    begin_main();
    ret(name(object));
    end();
    info({"--opt_level=3", "--call_assumptions=2"});
    const std::string text = dump();
    EXPECT_EQ(count(text, "function _idle"), 0) << text;
    for (const char* f : {"_called", "_referenced", "_outer", "_other_name", "_target", "_main"})
        EXPECT_EQ(count(text, std::string("function ") + f), 1) << f << "\n" << text;
    EXPECT_EQ(count(text, "return _object"), 1) << text;
}

TEST_F(ProgramTest, RecursionIsFoundAlongCyclesAndThroughTheOutside) {
    IC_SYMBOL* outside = global("_outside", int_fn, 5);
    IC_SYMBOL* even = declare("_even");
    IC_SYMBOL* odd = declare("_odd");
    IC_SYMBOL* leaf = declare("_leaf");
    IC_SYMBOL* entered = declare("_entered", 2);
    returns(even, call(odd));
    returns(odd, call(even));
    returns(leaf, icon(3));
    returns(entered, node(op::PLUS, pkg.int_t, call(outside), call(leaf)));
    begin_main();
    ret(call(even));
    end();
    const std::string text = info({"--opt_level=3"});
    const size_t at = text.find("\nThese functions may be recursive:\n");
    ASSERT_NE(at, std::string::npos) << text;
    const std::string list = text.substr(at, text.find("\n\n", at + 2) - at);
    for (const char* f : {"\t_even()\n", "\t_odd()\n", "\t_entered()\n"}) EXPECT_EQ(count(text, f), 1) << f << list;
    EXPECT_EQ(count(text, "\t_leaf()\n"), 0) << list;
    EXPECT_EQ(count(text, "\nThese external functions are called but not defined here:\n\t_outside()\n"), 1) << text;
}

TEST_F(ProgramTest, AnyCountOfFunctionsIsNumbered) {
    constexpr int count_of_functions = 33000;
    IC_SYMBOL* below = declare("_f0");
    returns(below, icon(3));
    for (int i = 1; i < count_of_functions; ++i) {
        IC_SYMBOL* f = declare(("_f" + std::to_string(i)).c_str());
        returns(f, call(below));
        below = f;
    }
    begin_main();
    ret(call(below));
    end();
    const std::string text = info({"--opt_level=3", "--disable_inlining"});
    EXPECT_EQ(count(text, "recursive") + count(text, "is not called"), 0);
}

TEST_F(ProgramTest, AModeThatNeedsAnEntryRevertsWithoutOne) {
    returns(declare("_f", 2), icon(1));
    const std::string text = info({"--opt_level=3", "--call_assumptions=2"});
    EXPECT_NE(text.find("Warning - Reverting to -op0: file has no entry functions!"), std::string::npos) << text;
    EXPECT_EQ(count(dump(), "function _f"), 1);
}

TEST_F(ProgramTest, AFunctionThatOnlyPassesItsParametersOnIsASynonym) {
    TYPE* type = function_type({pkg.int_t, pkg.int_t}, pkg.int_t);
    IC_SYMBOL* target = global("_target", type, 2);
    IC_SYMBOL* straight = global("_straight", type, 2);
    IC_SYMBOL* crossed = global("_crossed", type, 2);
    for (IC_SYMBOL* f : {target, straight, crossed}) {
        begin(f);
        IC_SYMBOL *a = local("a", pkg.int_t, 17), *b = local("b", pkg.int_t, 17);
        end_args();
        IC_SYMBOL *a2 = local("a", pkg.int_t), *b2 = local("b", pkg.int_t);
        end_locals();
        statement(node(op::PCOMMA, pkg.void_t, node(op::ASG, pkg.int_t, name(a2), name(a)),
                       node(op::ASG, pkg.int_t, name(b2), name(b))));
        IC_NODE* value = f == target     ? node(op::MINUS, pkg.int_t, name(a2), name(b2))
                         : f == straight ? call(target, node(op::COMMA, pkg.int_t, name(a2), name(b2)))
                                         : call(target, node(op::COMMA, pkg.int_t, name(b2), name(a2)));
        statement(node(op::RETURN, pkg.int_t, name(f), value));
        end();
    }
    const std::string text = info({"--opt_level=3", "--disable_inlining"});
    EXPECT_EQ(count(text, "Making _straight a function synonym of _target\n"), 1) << text << dump();
    EXPECT_EQ(count(text, "a function synonym of"), 1) << text;
    EXPECT_NE(dump().find("FUNC_SYNONYM"), std::string::npos) << dump();
}

// A list that begins a function need not copy its parameters: what else it reads of them is read where it stands.
TEST_F(ProgramTest, AListThatBeginsAFunctionMayHoldAnyTree) {
    IC_SYMBOL* total = global("_total", pkg.int_t, 2);
    IC_SYMBOL* f = global("_f", function_type({pkg.int_t, pkg.int_t}, pkg.int_t), 3);
    begin(f);
    IC_SYMBOL *a = local("a", pkg.int_t, 17), *b = local("b", pkg.int_t, 17);
    end_args();
    IC_SYMBOL* b2 = local("b", pkg.int_t);
    end_locals();
    statement(node(op::PCOMMA, pkg.void_t, node(op::PLUSASG, pkg.int_t, name(total), name(a)),
                   node(op::ASG, pkg.int_t, name(b2), name(b))));
    statement(node(op::RETURN, pkg.int_t, name(f), name(b2)));
    end();
    begin_main();
    ret(call(f, node(op::COMMA, pkg.int_t, icon(3), icon(4))));
    end();
    EXPECT_NE(optimized({"--opt_level=3"}).find("\n_total += 3\n"), std::string::npos) << dump();
}

} // namespace
