// Nodes: payloads through the I-file's operations, construction rules, copying, erasing, text.

#include "tree_builder.h"

#include "IFILE/ifile.h"

#include <cmath>
#include <cstring>
#include <sstream>

using namespace test_trees;

namespace {

class TreeNode : public Trees {};

TEST_F(TreeNode, TablesAgreeWithTheFileFormat) {
    EXPECT_STREQ(node_operator_name[LABELREF], "LABEL");
    EXPECT_STREQ(opname(221), "DFG_SPLIT");
    EXPECT_STREQ(opname(28), "OP#28");
    EXPECT_EQ(number_of_operands[28], 255);
    // Mirrors and opposites are involutions, and opposite outcomes share none and miss none.
    for (int op = 0; op < NO_OPCODES; ++op) {
        if (commute_inv[op] != ILLOP) {
            EXPECT_EQ(commute_inv[commute_inv[op]], op) << op;
        }
        if (boolean_inv[op] != ILLOP) {
            EXPECT_EQ(boolean_inv[boolean_inv[op]], op) << op;
        }
        if (op_of_opASG[op] != ILLOP) {
            EXPECT_EQ(opASG_of_op(op_of_opASG[op]), op);
        }
    }
    for (int op = FEQ; op <= FUNO; ++op)
        EXPECT_EQ(float_op_to_micro_ops[op - FEQ] ^ float_op_to_micro_ops[boolean_inv[op] - FEQ], 15) << opname(op);
}

TEST_F(TreeNode, NodeStaysSmall) { EXPECT_LE(sizeof(NODE), 232u); }

// The text of a float constant gives the same target value to the system's own reader and to any C library.
TEST_F(TreeNode, FconTextLosesNothing) {
    std::istringstream words("0 1 0.1 3.4028234663852886e38 1.17549435e-38 1e-45 5e-324 2.2250738585072014e-308 "
                             "-0.0 123456789.123 1e400 -1e400 nan 0x1.fffffep+127 1.7976931348623157e308 "
                             "9007199254740993");
    for (std::string word; words >> word;)
        for (TYPE* type : {tp->float_t, tp->double_t}) {
            const char* const text = word.c_str();
            NODE* a = fcon(text, type);
            NODE* b = fcon(a->fcon_value(), type);
            EXPECT_TRUE(f_bit_eq(a->u.fval, b->u.fval)) << text << " " << a->fcon_value();
            double host = strtod(a->fcon_value(), nullptr), own;
            f_ftoh(a->u.fval, &own);
            EXPECT_TRUE(std::isnan(host) ? f_is_nan(a->u.fval) : !memcmp(&host, &own, sizeof host)) << a->fcon_value();
            double expected = type == tp->float_t ? strtof(text, nullptr) : strtod(text, nullptr);
            if (!std::isnan(expected)) {
                EXPECT_EQ(host, expected) << text;
            }
        }
}

TEST_F(TreeNode, CopiesOwnTheirPayload) {
    NODE* s = new_node(SCON, tp->mk_ptr(tp->schar_t));
    s->mk_scon("a\0b", 3);
    NODE* t = bin(COMMA, bin(COMMA, s, fcon("0.5")), mk_ICALL("g", icon(3), tp->int_t), tp->int_t);
    NODE* c = copy_tree(t);
    EXPECT_TRUE(trees_are_congruent_se_ok(t, c));
    erase_tree(t);
    EXPECT_EQ(c->left->left->scon_length(), 3u);
    EXPECT_EQ(0, memcmp(c->left->left->scon_value(), "a\0b", 3));
    EXPECT_STREQ(c->right->icall_name(), "g");
    erase_tree(c);
}

#ifndef __SANITIZE_ADDRESS__
TEST_F(TreeNode, ErasingTwiceIsReported) {
    NODE* t = icon(7);
    EXPECT_EXIT(
        {
            erase_node(t);
            erase_node(t);
        },
        testing::ExitedWithCode(1), "erased a second time");
}
#endif

TEST_F(TreeNode, InfixText) {
    NODE *a = name(symbol("a", tp->int_t)), *b = name(symbol("b", tp->int_t)),
         *p = name(symbol("p", tp->mk_ptr(tp->int_t)));
    NODE* s = name(symbol("s", sample_struct()));
    auto A = [&] { return copy_tree(a); };
    auto B = [&] { return copy_tree(b); };
    auto P = [&] { return copy_tree(p); };
    struct {
        NODE* tree;
        const char* text;
    } cases[] = {
        {bin(MULT, bin(PLUS, A(), B()), icon(-2)), "(a + b) * -2"},
        {bin(MINUS, A(), bin(MINUS, B(), icon(1))), "a - (b - 1)"},
        {bin(MINUS, bin(MINUS, A(), B()), icon(1)), "a - b - 1"},
        {bin(PLUS, A(), un(SCONV, B(), tp->long_t)), "a + (long)b"},
        {un(UMINUS, un(UMINUS, A())), "- -a"},
        {deref(P()), "*p"},
        {maketree(UMULT, P(), A(), tp->int_t), "U*2(p, a)"},
        {member(copy_tree(s), sample_member(0)), "s.a"},
        {member(address(copy_tree(s)), sample_member(2), STREF), "(&s)->b"},
        {bin(ASG, A(), bin(QUEST, B(), bin(COLON, icon(1), icon(2)), tp->int_t)), "a = b ? 1 : 2"},
        {call("f", tp->int_t, bin(COMMA, A(), fcon("0.25"), tp->int_t)), "f(a, 0.25)"},
        {bin(FLTN, fcon("1"), fcon("2")), "!(1.0 >= 2.0)"},
        {maketree(PLUSPLUS, A(), icon(1), tp->int_t), "a++"},
        {icon(40000, tp->uint_t), "40000u"},
    };
    for (const auto& c : cases) EXPECT_EQ(show(c.tree), c.text);
    LBL one, two;
    one.index = 1, two.index = 2;
    EXPECT_EQ(stmt2infix(mk_IF(bin(LT, A(), B()), mk_LABELREF(&one), mk_LABELREF(&two))),
              "IF (a < b) goto L1 else L2;");
    EXPECT_EQ(stmt2infix(mk_LABELDEF(&two)), "L2:");
    NODE* cases_of_switch =
        bin(COMMA, bin(CASE, icon(3), mk_LABELREF(&one), tp->int_t), un(DEFAULT, mk_LABELREF(&two)), tp->int_t);
    EXPECT_EQ(stmt2infix(bin(SWITCH, A(), cases_of_switch, tp->int_t)),
              "SWITCH (a) { case 3: goto L1; default: goto L2; }");
}

TEST_F(TreeNode, DumpNamesIllegalTrees) {
    char text[2000] = "";
    FILE* out = fmemopen(text, sizeof text, "w");
    print_tree(out, nullptr);
    print_tree(out, bin(PLUS, icon(1), icon(2)));
    fclose(out);
    EXPECT_STREQ(text, "   >>>>>>>>>> ILLEGAL TREE: (nil) <<<<<<<<<<<<\nPLUS <int>\n  ICON 1 <int>\n  ICON 2 <int>\n");
}

} // namespace
