// A function in memory, without an I-file: statements are made by hand and built into a graph.
#pragma once

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/dominator.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/type_ops.h"
#include "UTIL/safemem.h"

#include <gtest/gtest.h>

#include <map>
#include <memory>
#include <string>
#include <vector>

class FunctionTest : public testing::Test {
protected:
    static void SetUpTestSuite() {
        if (tp) return;
        tp = new TYPE_PKG;
        TYPE_PKG::init_type_pkg(tp);
        init_opcode_tables();
        init_types();
    }

    void SetUp() override {
        init_symbols();
        begin("f");
    }
    void TearDown() override {
        erase_all();
        currfunc = nullptr;
        currfuninfo = nullptr;
        for (LBL* lbl : unused) delete lbl;
    }

    void begin(const char* name) {
        currfunc = make_symbol(name, function_type(), SC_EXTDEF, 0);
        currfunc->location = 100;
        currfuninfo = make_FUNINFO(currfunc);
        LS::init(nullptr, currfunc, 0);
        LS::open(nullptr, currfunc, 0);
        LS::open(nullptr, currfunc, 0);
    }

    static TYPE* function_type() {
        TYPE* t = tp->mk_func(tp->int_t, false, false, true, 0, 32, 32);
        tp->set_params(t, nullptr);
        tp->type_frozen(t);
        return t;
    }
    static SYMTAB* make_symbol(const char* name, TYPE* type, int sclass, int level) {
        auto* s = new SYMTAB;
        s->name = safestrdup(name);
        s->type = s->orig_type = type;
        s->size = type->size;
        s->align = type->align;
        s->sclass = static_cast<int8_t>(sclass);
        s->level = level;
        return s;
    }
    SYMTAB* local(const char* name, TYPE* type = tp->int_t, int sclass = SC_AUTO) {
        SYMTAB* s = make_symbol(name, type, sclass, 2);
        s->index = currfuninfo->next_symbol_index++;
        sym_def(s);
        LS::add_symbol(s);
        return s;
    }

    // struct { int a; long b; }
    static TYPE* pair() {
        static TYPE* made = nullptr;
        if (made) return made;
        TYPE* t = tp->mk_struct("pair", 64, 32, false);
        auto* a = new fkMDATA("a", tp->int_t, 0, 0, 0, false, false, false, false);
        a->next = new fkMDATA("b", tp->long_t, 0, 32, 0, false, false, false, false);
        tp->set_mdata(t, a);
        tp->type_frozen(t);
        return made = t;
    }
    static NODE* icon(long v, TYPE* type = tp->int_t) { return mk_ICON(INT65(v), type); }
    static NODE* address(SYMTAB* s) { return maketree(UAND, mk_NAME(s), nullptr, tp->mk_ptr(s->type)); }

    // ---- Statements, in source order
    LBL* label(int n) {
        LBL*& lbl = labels[n];
        if (!lbl) {
            lbl = new LBL;
            lbl->index = n;
        }
        return lbl;
    }
    void add(NODE* t) { currfuninfo->statements = mkelist(t, currfuninfo->statements, nullptr); }
    void define(int n) {
        add(mk_LABELDEF(label(n)));
        defined[n] = true;
    }
    NODE* ref(int n) { return mk_LABELREF(label(n)); }
    void go(int n) { add(maketree(BRANCH, ref(n), nullptr, tp->int_t)); }
    void branch_if(SYMTAB* cond, int if_true, int if_false) { add(mk_IF(mk_NAME(cond), ref(if_true), ref(if_false))); }
    void assign(SYMTAB* to, long value) { add(mk_ASG(mk_NAME(to), mk_ICON(INT65(value), to->type))); }
    void ret(SYMTAB* value) { add(maketree(RETURN, mk_NAME(currfunc), mk_NAME(value), tp->int_t)); }

    // The text of all, in the order of the blocks.
    static std::string statements() {
        std::string all;
        for (const BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (const LIST* s = bb->statements; s; s = s->rest) all += stmt2infix(s->first) + " ";
        return all;
    }

    // The block that a label starts, null if it is gone.
    static BBLK* block_of(int n) {
        for (BBLK* bb = currfuninfo->bb_list; bb; bb = bb->dflink)
            for (LBL* lbl = bb->label; lbl; lbl = lbl->next)
                if (marks().count(lbl) && marks()[lbl] == n) return bb;
        return nullptr;
    }
    void build() {
        marks().clear();
        for (auto& [n, lbl] : labels) {
            marks()[lbl] = n;
            if (!defined[n]) unused.push_back(lbl);
        }
        sym_split(currfuninfo);
        buildcfg();
    }
    static bool has_edge(const BBLK* a, const BBLK* b) {
        return edge_memberp(b, a->successors) != nullptr && edge_memberp(a, b->predecessors) != nullptr;
    }
    static bool valid() { return validate_cfg() == 0 && validate_stmts() == 0; }

private:
    static std::map<LBL*, int>& marks() {
        static std::map<LBL*, int> m;
        return m;
    }
    std::map<int, LBL*> labels;
    std::map<int, bool> defined;
    std::vector<LBL*> unused;
};
