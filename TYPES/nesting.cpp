// Proof that no structure contains itself by value.
#include "TYPES/type_impl.h"

#include <unordered_map>

// The structure that a member of this type holds by value, or null.
static TYPE* held_csu(TYPE* t) {
    t = t->real;
    while (t->kind == TYPE::tpk_array) t = t->component()->real;
    return t->get_csu() ? find_type(t) : nullptr;
}

static std::vector<TYPE*> held_csus(const TYPE* t) {
    std::vector<TYPE*> held;
    for (fkMDATA* m = t->mdata(); m; m = m->next)
        if (TYPE* c = held_csu(m->type)) held.push_back(c);
    if (const CSU_EXTRAS* x = t->csu_extras())
        for (auto& base : x->base_classes.items)
            if (TYPE* c = base.type ? held_csu(base.type) : nullptr) held.push_back(c);
    return held;
}

void check_csu_nesting(TYPE* root) {
    enum STATE { unseen, open, done };
    struct FRAME {
        TYPE* type;
        std::vector<TYPE*> held;
    };
    std::unordered_map<const TYPE*, STATE> state; // looked up only
    for (TYPE* start : type_tree_order(root)) {
        if (!start->get_csu() || state[start] != unseen) continue;
        std::vector<FRAME> path;
        auto enter = [&](TYPE* t) {
            state[t] = open;
            path.push_back({t, held_csus(t)});
        };
        enter(start);
        while (!path.empty()) {
            FRAME& top = path.back();
            if (top.held.empty()) {
                state[top.type] = done;
                path.pop_back();
                continue;
            }
            TYPE* next = top.held.back();
            top.held.pop_back();
            STATE& s = state[next];
            if (s == open) tp_die("Type contains itself:  check_csu_nesting()");
            if (s == unseen) enter(next);
        }
    }
}
