// Makes an I-file piece by piece: what test fixtures and generators of units share.
//
// Symbols and nodes belong to the builder. Every type that a symbol or node names is marked for the output as it is
// used.
#pragma once

#include "tools/model/ic_model.h"

#include <memory>
#include <string>
#include <vector>

class IC_BUILDER {
protected:
    // With a type package of its own, or one that is set up already.
    IC_BUILDER() : own_pkg(std::make_unique<TYPE_PKG>()), pkg(*own_pkg) { TYPE_PKG::init_type_pkg(&pkg); }
    explicit IC_BUILDER(TYPE_PKG& package) : pkg(package) {}

    // Makes the type package the current one and opens the unit; takes over `out`.
    void start(FILE* out, const char* source) {
        tp = &pkg;
        if_node_table_init();
        file = I_FILE::if_create(out, &pkg, source);
    }

    TYPE* function_type(const std::vector<TYPE*>& params, TYPE* result, bool variadic = false) {
        fkPARAM* list = nullptr;
        for (auto it = params.rbegin(); it != params.rend(); ++it) {
            auto* p = new fkPARAM;
            p->type = *it;
            p->next = list;
            list = p;
        }
        TYPE* t = pkg.mk_func(result, false, variadic, true, 0, 32, 32);
        pkg.set_params(t, list);
        pkg.type_frozen(t);
        return t;
    }

    IC_SYMBOL* symbol(const std::string& name, TYPE* type, int sclass) {
        symbols.push_back(std::make_unique<IC_SYMBOL>());
        IC_SYMBOL* s = symbols.back().get();
        s->name = arena.copy(name.c_str());
        s->type = type;
        s->size = type->size;
        s->align = type->align;
        s->sclass = static_cast<int8_t>(sclass);
        file->if_reference_type(type);
        return s;
    }
    IC_SYMBOL* global(const std::string& name, TYPE* type, int sclass = 2) {
        IC_SYMBOL* s = symbol(name, type, sclass);
        file->if_enter_global(s);
        return s;
    }
    // Of the function in work, at the level that its records have reached.
    IC_SYMBOL* local(const std::string& name, TYPE* type, int sclass = 1) {
        IC_SYMBOL* s = symbol(name, type, sclass);
        file->if_enter_local(s);
        file->if_write_symbol(s);
        return s;
    }

    IC_NODE* node(int opcode, TYPE* type, IC_NODE* left = nullptr, IC_NODE* right = nullptr) {
        auto* n = new (arena.take(sizeof(IC_NODE))) IC_NODE(&arena);
        n->op = opcode;
        n->type = type;
        n->left = left;
        n->right = right;
        file->if_reference_type(type);
        ++node_count;
        return n;
    }

private:
    std::unique_ptr<TYPE_PKG> own_pkg;

protected:
    TYPE_PKG& pkg;
    I_FILE* file = nullptr;
    IC_ARENA arena;
    long node_count = 0; // made so far

private:
    std::vector<std::unique_ptr<IC_SYMBOL>> symbols;
};
