// What reading does to a function, seen in what is written again.

#include "unit_builder.h"

namespace {

class ReadTest : public UnitTest {};

TEST_F(ReadTest, CommentsAndInlineAssemblyKeepTheirPlace) {
    file->if_write_comment("of the file");
    file->if_write_comment("* of a tool");
    begin_main();
    set(x, icon(1));
    file->if_write_comment("between");
    file->if_write_comment("*hidden");
    file->if_write_assembly(" NOP", &psn);
    set(y, icon(2));
    ret(node(op::PLUS, pkg.int_t, name(x), name(y)));
    end();
    expect_lines({"// of the file", "x = 1", "// between", "asm \" NOP\"", "y = 2", "return x + y"});
    expect_no_line("of a tool");
    expect_no_line("hidden");
}

TEST_F(ReadTest, CountedLoopsBecomeBranchesOnTheCounter) {
    begin_main();
    set(x, icon(3));
    statement(node(op::LOOP, pkg.int_t, name(x), ref(4)));
    statement(node(op::PLUSASG, pkg.int_t, name(y), icon(1)));
    statement(node(op::ENDLOOP, pkg.int_t, name(x), ref(4)));
    ret(name(y));
    end();
    // The decrement is compared with -1: false, and so back to the label, while the counter was not 0.
    expect_lines({"x = 3", "L1:", "y += 1", "if (!((x -= 1) == -1)) goto L1", "return y"});
}

TEST_F(ReadTest, TheHeadOfACountedLoopKeepsItsEffect) {
    begin_main();
    statement(node(op::LOOP, pkg.int_t, node(op::ASG, pkg.int_t, name(x), icon(3)), ref(4)));
    statement(node(op::ENDLOOP, pkg.int_t, name(x), ref(4)));
    ret(name(x));
    end();
    expect_lines({"x = 3", "L1:", "if (!((x -= 1) == -1)) goto L1"});
}

TEST_F(ReadTest, PointerScalingIsMultiplicationByAddressUnits) {
    begin_main();
    set(y, node(op::PMCONV, pkg.int_t, name(x), icon(48)));
    ret(name(y));
    end();
    expect_lines({"y = x * 3"});
}

TEST_F(ReadTest, WithoutAnExceptionTableCallsHaveNoEntry) {
    IC_SYMBOL* f = global("_f", int_fn, 5);
    begin_main();
    set(x, call(f, nullptr, 9));
    ret(name(x));
    end();
    expect_lines({"x = _f()"});
}

// ---- Intrinsics

TEST_F(ReadTest, AnUnknownIntrinsicIsCalledByName) {
    begin_main();
    set(x, intrinsic(op::MCALL, "mystery", pkg.int_t, name(y)));
    set(y, intrinsic(op::MCALL, "mystery", pkg.int_t, name(x)));
    ret(name(y));
    end();
    expect_lines({"x = _mystery(y)", "y = _mystery(x)"});
    const std::string text = dump();
    EXPECT_EQ(text.find("_mystery: int(int), class 5"), text.rfind("_mystery: int(int), class 5")) << "declared once\n" << text;
}

TEST_F(ReadTest, AnUnknownIntrinsicFindsTheFunctionOfThatName) {
    IC_SYMBOL* f = global("_mystery", function_type({pkg.int_t}, pkg.int_t), 5);
    (void)f;
    begin_main();
    set(x, intrinsic(op::MCALL, "mystery", pkg.int_t, name(y)));
    ret(name(x));
    end();
    expect_lines({"x = _mystery(y)"});
}

TEST_F(ReadTest, UnderTheSecondAbiNamesHaveNoPrefix) {
    begin_main();
    statement(intrinsic(op::UMCALL, "mystery", pkg.void_t));
    ret(name(x));
    end();
    expect_lines({"mystery()"}, {"--abi=eabi", "--opt_level=off"});
}

TEST_F(ReadTest, AKnownMachineOperationLosesItsHiddenOperandAgain) {
    begin_main();
    statement(intrinsic(op::UMCALL, "__eallow", pkg.void_t));
    statement(intrinsic(op::MCALL, "__inc", pkg.void_t, node(op::UAND, pkg.mk_ptr(pkg.int_t), name(x))));
    ret(name(x));
    end();
    expect_lines({"__eallow()", "__inc(&x)", "return x"});
    expect_no_line("ARGREF");
}

TEST_F(ReadTest, ABranchHintComesBackAsItWas) {
    begin_main();
    IC_NODE* args = node(op::COMMA, pkg.long_t, node(op::SCONV, pkg.long_t, name(x)), icon(0, pkg.long_t));
    IC_NODE* expect = intrinsic(op::ICALL, "__builtin_expect", pkg.long_t, args);
    unless(node(op::NEQ, pkg.int_t, expect, icon(0, pkg.long_t)), 2);
    set(y, icon(1));
    label(2);
    ret(name(y));
    end();
    const std::string text = optimized();
    EXPECT_NE(text.find("__builtin_expect("), std::string::npos) << text;
}

TEST_F(ReadTest, ABranchHintOnAValueWiderThanTheCallKeepsTheValue) {
    IC_NODE* args = node(op::COMMA, pkg.long_t, name(global("_wide", pkg.llong_t)), icon(0, pkg.long_t));
    begin_main();
    unless(node(op::NEQ, pkg.int_t, intrinsic(op::ICALL, "__builtin_expect", pkg.long_t, args), icon(0)), 2);
    set(y, icon(1));
    label(2);
    ret(name(y));
    end();
    expect_lines({"if (!(__builtin_expect(_wide, 0))) goto L2"});
}

// ---- Functions that are refused

TEST_F(ReadTest, LabelsMustBeDefinedOnce) {
    begin_main();
    go(3);
    ret(name(x));
    end();
    expect_refusal("label 3 is not defined");
}
TEST_F(ReadTest, LabelsMustNotBeDefinedTwice) {
    begin_main();
    label(3);
    label(3);
    ret(name(x));
    end();
    expect_refusal("label 3 is defined twice");
}
TEST_F(ReadTest, AFunctionHasOneBody) {
    begin_main();
    ret(name(x));
    end();
    begin(main_sym);
    end_args();
    end_locals();
    ret(icon(1));
    end();
    expect_refusal("_main is defined twice");
}
TEST_F(ReadTest, OnlyFunctionsHaveBodies) {
    IC_SYMBOL* v = global("_v", pkg.int_t);
    begin(v);
    end_args();
    end_locals();
    end();
    expect_refusal("_v, which is no function");
}
// ---- One wrong tree each, in a function that is right otherwise

class ShapeTest : public UnitTest {
protected:
    void refuses(IC_NODE* tree, const char* text) {
        statement(tree);
        ret(icon(0));
        end();
        expect_refusal(text);
    }
    ShapeTest() {
        begin_main();
        label(1);
        i = pkg.int_t;
    }
    TYPE* i;
};

TEST_F(ShapeTest, ALabelIsNoValue) { refuses(node(op::PLUS, i, icon(1), ref(1)), "LABEL stands where a value must stand"); }
TEST_F(ShapeTest, AValueIsNoLabel) {
    refuses(node(op::CBRANCH, i, name(x), icon(1)), "ICON stands where a label must stand");
}
TEST_F(ShapeTest, ACaseStandsInASwitch) {
    refuses(node(op::CASE, i, icon(1), ref(1)), "CASE stands where a statement must stand");
}
TEST_F(ShapeTest, TheDefaultIsLast) {
    IC_NODE* list = node(op::COMMA, i, node(op::DEFAULT, i, ref(1)), node(op::CASE, i, icon(1), ref(1)));
    refuses(node(op::SWITCH, i, name(x), list), "DEFAULT stands where a case list must stand");
}
TEST_F(ShapeTest, CasesAreConstants) {
    refuses(node(op::SWITCH, i, name(x), node(op::CASE, i, name(y), ref(1))), "NAME stands where a case constant must stand");
}
TEST_F(ShapeTest, AConditionHasTwoArms) {
    refuses(node(op::QUEST, i, name(x), icon(1)), "ICON stands where the arms of a condition must stand");
}
TEST_F(ShapeTest, ABranchIsNoOperand) {
    refuses(node(op::COMMAOP, i, node(op::BRANCH, i, ref(1)), icon(1)), "BRANCH stands where a value must stand");
}
TEST_F(ShapeTest, AListIsNoValue) {
    refuses(node(op::ASG, i, name(x), node(op::COMMA, i, icon(1), icon(2))), "COMMA stands where a value must stand");
}
TEST_F(ShapeTest, IndirectionNeedsAPointer) {
    refuses(node(op::UMULT, i, name(x)), "an indirection through what is no pointer");
}
TEST_F(ShapeTest, WideConstantsHaveAnIntegerType) {
    IC_NODE* wide = node(op::LCON, pkg.float_t);
    wide->text = "4294967296";
    refuses(node(op::ASG, i, name(x), wide), "a constant ICON of type float");
}
TEST_F(ShapeTest, CountersAndScalesAreIntegers) {
    refuses(node(op::PMCONV, pkg.float_t, name(x), icon(16)), "a pointer's scale of type float");
}
TEST_F(ShapeTest, TruthIsAScalar) {
    IC_SYMBOL* f = global("_f", int_fn, 5);
    refuses(node(op::CBRANCH, i, name(f), ref(1)), "the truth of a int()");
}
TEST_F(ShapeTest, AMemberIsReadAsOfItsKind) {
    TYPE* type = pkg.mk_struct("s", 16, 16, false);
    auto* m = new fkMDATA("m", i, 0, 0, 0, false, false, false, false);
    pkg.set_mdata(type, m);
    pkg.type_frozen(type);
    IC_NODE* field = node(op::FIELD, i);
    field->mk_field(1, m, type);
    TYPE* complex = pkg.mk_complex(pkg.float_t);
    refuses(node(op::ASG, complex, node(op::STDOT, complex, name(global("_s", type, 2)), field), icon(1)),
            "STDOT of type complex float");
}
TEST_F(ShapeTest, ConstantsHaveTheirKindOfType) {
    refuses(node(op::ASG, i, name(x), icon(1, pkg.float_t)), "a constant ICON of type float");
}

// What no cast makes of an operand is refused; that a parser left a cast out is not.
TEST(Shapes, OperatorsHaveOperandsThatTheyCanComputeWith) {
    struct UNIT : UnitTest {
        void TestBody() override {}
        std::string error(int opcode, const char* type, const char* left, const char* right) {
            const std::map<std::string, TYPE*> types = {
                {"int", pkg.int_t}, {"float", pkg.float_t}, {"function", int_fn}, {"pointer", pkg.mk_ptr(pkg.int_t)},
                {"complex", pkg.mk_complex(pkg.float_t)}};
            std::map<std::string, IC_SYMBOL*> objects;
            for (const auto& [text, t] : types) objects[text] = global("_" + text, t, text == "function" ? 5 : 2);
            begin_main();
            IC_NODE* const second = *right ? name(objects.at(right)) : nullptr;
            statement(node(opcode, types.at(type), opcode == op::ASG && !*left ? icon(1) : name(objects.at(left)), second));
            ret(icon(0));
            end();
            const RESULT r = optimize();
            return r.status == 0 ? "" : r.err;
        }
    };
    const struct {
        int opcode;
        const char *type, *left, *right, *error;
    } cases[] = {
        {op::PLUS, "float", "int", "float", ""},
        {op::PLUS, "complex", "int", "complex", ""},
        {op::PLUS, "int", "complex", "int", "PLUS of type int"},
        {op::PLUS, "int", "function", "int", "PLUS of what has type int()"},
        {op::UMINUS, "float", "complex", "", "UMINUS of type float"},
        {op::ANDB, "int", "float", "int", "ANDB of what has type float"},
        {op::EQ, "int", "complex", "complex", ""},
        {op::EQ, "complex", "int", "int", "EQ of type complex float"},
        {op::LT, "int", "complex", "int", "LT of what has type complex float"},
        {op::ASG, "complex", "complex", "int", ""},
        {op::ASG, "int", "int", "complex", "ASG of what has type complex float"},
        {op::PLUSASG, "int", "int", "complex", "PLUSASG of what has type complex float"},
        {op::ASG, "complex", "complex", "pointer", "ASG of what has type int *"},
        {op::ASG, "int", "", "int", "ASG to what is no place"},
    };
    for (const auto& c : cases) {
        UNIT unit;
        const std::string error = unit.error(c.opcode, c.type, c.left, c.right);
        EXPECT_EQ(error.empty(), !*c.error) << error;
        EXPECT_NE(error.find(c.error), std::string::npos) << error << " instead of " << c.error;
    }
}

TEST_F(ReadTest, WhatAnEarlierRunLearnedOfAnAccessIsDropped) {
    begin_main();
    IC_NODE* access = node(119, pkg.int_t, name(x));
    access->number = 4;
    set(y, access);
    ret(name(y));
    end();
    expect_lines({"y = x", "return y"});
}

TEST_F(ReadTest, ACallMustNameAnEntryOfTheTable) {
    IC_SYMBOL* f = global("_f", int_fn, 5);
    begin_main();
    set(x, call(f, nullptr, 9));
    ret(name(x));
    EHT_ENTRY root;
    root.id = 1;
    root.kind = EHK_ROOT_NODE;
    file->if_write_func_eht(&root, 1);
    end();
    expect_refusal("exception entry 9");
}

} // namespace
