// Marks the types that the output needs.
#include "TYPES/type_impl.h"

namespace {

// Types whose parts are to be marked. A type that a merged one refers to is marked by its final form.
class MARKER {
public:
    void mark(TYPE* t) {
        if (!t) return;
        t = find_type(t);
        if (t->refd) return;
        t->refd = true;
        todo_m.push_back(t);
    }
    void expand(TYPE* t) { todo_m.push_back(t); }
    void run() {
        while (!todo_m.empty()) {
            TYPE* t = todo_m.back();
            todo_m.pop_back();
            mark_parts(t);
        }
    }

private:
    void mark_parts(TYPE* t) {
        mark(t->component());
        if (t->kind == TYPE::tpk_ptm) mark(t->ptm_class());
        if (t->kind == TYPE::tpk_func)
            for (fkPARAM* p = t->params(); p; p = p->next) mark(p->type);
        if (t->get_csu()) mark_csu_parts(t);
    }
    void mark_csu_parts(TYPE* t) {
        for (fkMDATA* m = t->mdata(); m; m = m->next) mark(m->type);
        const CSU_EXTRAS* x = t->csu_extras();
        if (!x) return;
        for (auto& e : x->base_classes.items) mark(e.type);
        for (auto& e : x->friend_functions.items) mark(e.type);
        for (auto& e : x->friend_classes.items) mark(e);
        for (auto& e : x->nested_types.items) mark(e);
        for (auto& e : x->static_data.items) mark(e.type);
        for (auto& e : x->member_functions.items) mark(e.type);
        for (auto& e : x->parameters.items) mark(e.type);
    }
    std::vector<TYPE*> todo_m;
};

} // namespace

void TYPE::mark_named_types(TYPE* root, bool keep_named) {
    if (!keep_named) return;
    for (TYPE* t : type_tree_order(root))
        if ((t->kind == tpk_typedef || t->kind >= tpk_enum) && !t->equiv && !type_is_tagless(t)) t->refd = true;
}

void TYPE::mark_refed_types(TYPE* root) {
    MARKER marker;
    for (TYPE* t : type_tree_order(root)) {
        if (!t->refd) continue;
        if (t->equiv)
            marker.mark(t);
        else
            marker.expand(t);
    }
    marker.run();
}

void TYPE::mark_refed_recur() {
    MARKER marker;
    marker.mark(this);
    marker.run();
}

void mark_func_args(TYPE* func) {
    MARKER marker;
    for (fkPARAM* p = func->params(); p; p = p->next) marker.mark(p->type);
    marker.run();
}
