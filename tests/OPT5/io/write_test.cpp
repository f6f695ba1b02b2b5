// The form in which functions leave.

#include "unit_builder.h"

namespace {

class WriteTest : public UnitTest {};

TEST_F(WriteTest, WideConstantsAreLconsOnlyWhereTheyMustBe) {
    IC_SYMBOL* small = global("_small", pkg.llong_t);
    IC_SYMBOL* wide = global("_wide", pkg.llong_t);
    begin_main();
    IC_NODE* big = node(op::LCON, pkg.llong_t);
    big->text = "4294967296";
    IC_NODE* fits = node(op::LCON, pkg.llong_t);
    fits->text = "-2147483648";
    statement(node(op::ASG, pkg.llong_t, name(wide), big));
    statement(node(op::ASG, pkg.llong_t, name(small), fits));
    ret(icon(0));
    end();
    optimized();
    const std::string raw = place.get("unit.opt");
    EXPECT_NE(raw.find(std::string("4294967296\0", 11)), std::string::npos);
    EXPECT_EQ(raw.find("-2147483648"), std::string::npos) << "it fits an ICON";
    expect_lines({"_wide = 4294967296", "_small = -2147483648"});
}

TEST_F(WriteTest, APointersConstantIsItsBits) {
    TYPE* const type = pkg.mk_ptr(int_fn);
    begin_main();
    statement(node(op::UCALL, pkg.int_t, icon(0xFFFFFFFF, type)));
    ret(icon(0));
    end();
    expect_lines({"4294967295()"});
}

TEST_F(WriteTest, ParametersKeepTheirOrderAndUnusedLocalsGo) {
    IC_SYMBOL* f = global("_f", function_type({pkg.int_t, pkg.long_t, pkg.int_t}, pkg.int_t));
    begin(f);
    IC_SYMBOL* a = local("a", pkg.int_t, 17);
    IC_SYMBOL* b = local("b", pkg.long_t, 17);
    IC_SYMBOL* c = local("c", pkg.int_t, 17);
    end_args();
    IC_SYMBOL* a2 = local("a", pkg.int_t);
    local("b", pkg.long_t);
    IC_SYMBOL* c2 = local("c", pkg.int_t);
    local("idle", pkg.int_t);
    end_locals();
    (void)b;
    statement(node(op::PCOMMA, pkg.void_t, node(op::ASG, pkg.int_t, name(a2), name(a)), node(op::ASG, pkg.int_t, name(c2), name(c))));
    statement(node(op::RETURN, pkg.int_t, name(f), node(op::PLUS, pkg.int_t, name(a2), name(c2))));
    end();
    const std::string text = optimized();
    const size_t pa = text.find("0 a: int, class 17"), pb = text.find("1 b: long, class 17"), pc = text.find("2 c: int, class 17");
    EXPECT_TRUE(pa < pb && pb < pc && pc != std::string::npos) << text;
    EXPECT_EQ(text.find("idle"), std::string::npos);
    EXPECT_EQ(text.find("b: long, class 1,"), std::string::npos) << "the copy of b was not used";
}

TEST_F(WriteTest, DeclaredTypesComeBack) {
    TYPE* color = pkg.mk_enum("color", pkg.int_t, 16, 16, false);
    auto* red = new fkETOR;
    red->name = "red";
    red->value = 3;
    pkg.set_etors(color, red);
    pkg.type_frozen(color);
    IC_SYMBOL* g = global("_g", pkg.mk_qual(color, QUAL_VOLATILE));
    IC_SYMBOL* s = global("_s", pkg.short_t);
    begin_main();
    statement(node(op::ASG, color, name(g), icon(3)));
    statement(node(op::ASG, pkg.short_t, name(s), icon(4)));
    ret(icon(0));
    end();
    const std::string text = optimized();
    EXPECT_NE(text.find("_g: volatile enum color"), std::string::npos) << text;
    EXPECT_NE(text.find("_s: short"), std::string::npos) << text;
    EXPECT_NE(text.find("red = 3"), std::string::npos) << text;
}

// ---- Exception tables

class TableTest : public WriteTest {
protected:
    static EHT_ENTRY entry(uint32_t id, uint32_t kind, uint32_t next) {
        EHT_ENTRY e;
        e.id = id;
        e.kind = kind;
        e.next = next;
        return e;
    }
};

TEST_F(TableTest, UnusedEntriesGoAndCallsAreRenumbered) {
    IC_SYMBOL* f = global("_f", int_fn, 5);
    begin_main();
    set(x, call(f, nullptr, 4));
    ret(name(x));
    std::vector<EHT_ENTRY> table{entry(1, EHK_ROOT_NODE, 0), entry(2, EHK_CLEANUP, 1), entry(3, EHK_CLEANUP, 1), entry(4, EHK_CLEANUP_END, 3)};
    table[1].cleanup = call(f);
    table[2].cleanup = call(f);
    file->if_write_func_eht(table.data(), 4);
    end();
    optimized();
    IC_UNIT& unit = read_back();
    const IC_ITEM* eht = nullptr;
    const IC_NODE* tree = nullptr;
    for (const IC_ITEM& item : unit.items) {
        if (item.kind == IFR_EHT_HEADER) eht = &item;
        if (item.kind == IFR_EXPR && item.tree && item.tree->op == op::ASG) tree = item.tree;
    }
    ASSERT_TRUE(eht && tree);
    // Entry 4 does nothing and leads to 3, which closes up behind the unused 2; what the call named stays as well.
    ASSERT_EQ(eht->number, 3u);
    EXPECT_EQ(eht->eht[1].id, 2u);
    EXPECT_EQ(eht->eht[1].kind, uint32_t(EHK_CLEANUP));
    EXPECT_EQ(eht->eht[1].next, 1u);
    EXPECT_EQ(tree->right->number2, 2u);
}

TEST_F(TableTest, HandlersStayReachableAndTheirLabelsFollow) {
    IC_SYMBOL* f = global("_f", int_fn, 5);
    begin_main();
    set(y, icon(5));
    set(x, call(f, nullptr, 2));
    ret(name(x));
    label(77);
    ret(name(y));
    std::vector<EHT_ENTRY> table{entry(1, EHK_ROOT_NODE, 0), entry(2, EHK_CATCH, 1)};
    table[1].count = 1;
    table[1].catches.push_back({"int", 77, false});
    file->if_write_func_eht(table.data(), 2);
    end();
    const std::string text = optimized();
    EXPECT_NE(text.find("\nL1:\nreturn y\n"), std::string::npos) << text;
    EXPECT_EQ(text.find("dispatch"), std::string::npos) << "it is not for the code generator";
    IC_UNIT& unit = read_back();
    for (const IC_ITEM& item : unit.items)
        if (item.kind == IFR_EHT_HEADER) {
            EXPECT_EQ(item.eht[1].catches.at(0).label, 1u);
        }
}

// ---- The unit as a whole

TEST_F(WriteTest, StaticDataNamedOnlyByAnInitializerIsKept) {
    IC_SYMBOL* target = global("_target", pkg.int_t, 3);
    IC_SYMBOL* pointer = global("_pointer", pkg.mk_ptr(pkg.int_t), 2);
    begin_main();
    ret(icon(0));
    end();
    file->if_write_init(pointer);
    file->if_write_expr_node(node(op::UAND, pkg.mk_ptr(pkg.int_t), name(target)));
    file->if_write_expr_node(node(op::ENDINIT, pkg.int_t));
    optimized({"--opt_level=3", "--call_assumptions=3"});
    IC_UNIT& unit = read_back();
    for (const IC_SYMBOL* s : unit.globals)
        if (std::string(s->name) == "_target") {
            EXPECT_NE(s->retention, I_SYMTAB::RETENTION_DROP);
        }
}

} // namespace
