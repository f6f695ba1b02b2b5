// Not built yet: the inliners. Calls of small functions are chosen everywhere.
#include "OPT5/ipa/inline.h"

#include "BITVEC/bitvec.h"
#include "OPT5/ipa/copy_cfg.h"
#include "OPT5/ipa/progana.h"
#include "OPT5/ir/bblk.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "OPT5/ir/walks.h"

#include <cstdlib>

void create_inliner() {}
void init_proc_integration() {}
bool inline_recursion_is_limited() { return true; }
void auto_inline_call_sites() {
    if (!std::getenv("ZOPT_TRY_INLINE")) return;
    if (!cg_list) set_up_and_build_call_graph();
    for (const FUNLIST* p = cg_list; p; p = p->next) {
        FUNINFO* f = p->fun;
        if (!f->bb_list) continue;
        for_each_tree(f, [f](const NODE* tree) {
            for_each_subtree(tree, [f](const NODE* t) {
                FUNINFO* callee = op_is_call(t->op) ? find_FUNINFO_for_call(t) : nullptr;
                if (!callee || !callee->bb_list || callee->size == 0 || callee->has_eh() || !t->call) return;
                if (TEST_FLAG(callee, FUN_never_returns) || callee->cg_order <= f->cg_order) return;
                if (callee->symbol->type->getr(TYPE::tpk_func)->vararg()) return;
                if (t->call->id < f->unique_call_index) f->inline_sites->set(t->call->id);
                FUNINFO* before = currfuninfo;
                save_cfg(callee);
                currfuninfo = before;
            });
        });
    }
}
void dump_psnrefs() {}
