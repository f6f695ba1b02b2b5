// Pruning of a function's exception table: entries that no call reaches are removed, chains skip what does nothing, ids
// close up.

#include "OPT5/io/write.h"

#include "OPT5/ir/bblk.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/trees.h"
#include "UTIL/abort.h"

namespace {

// Calls stand anywhere but in the target lists of SWITCH and IF.
void collect_calls(NODE* t, std::vector<NODE*>& calls) {
    for (; t; t = t->right) {
        if (op_is_call(t->op) && t->eh_entry()) calls.push_back(t);
        collect_calls(t->left, calls);
        if (t->op == SWITCH || t->op == IF) return;
    }
}

class PRUNER {
public:
    explicit PRUNER(FUNINFO* funinfo) : f(funinfo), eht(funinfo->eht), n(funinfo->eht.size()) {}

    void run() {
        if (n == 0) return;
        collect();
        mark_kept();
        shorten_chains();
        extend_used();
        compact();
    }

private:
    void collect() {
        used.assign(n, false);
        used[0] = true;
        if (n > 1) used[1] = true;
        for (BBLK* bb = f->bb_list; bb; bb = bb->dflink)
            for (LIST* s = bb->statements; s; s = s->rest) collect_calls(s->first, calls);
        for (NODE* call : calls) used[call->eh_entry()] = true;
        calls_of_cleanup.resize(n);
        for (size_t i = 0; i < n; ++i)
            if (eht[i].kind == EHK_CLEANUP) collect_calls(eht[i].cleanup, calls_of_cleanup[i]);
    }

    void mark_kept() {
        kept.assign(n, false);
        kept[0] = true;
        for (size_t i = 1; i < n; ++i) switch (eht[i].kind) {
            case EHK_ROOT_NODE:
            case EHK_CATCH:
            case EHK_THROW_TERMINATE: kept[i] = true; break;
            case EHK_CLEANUP:
            case EHK_CATCH_END: kept[i] = kept[eht[i].next_entry] = true; break;
            default: break;
            }
    }

    // Every chain ends at the root, or is a ring that the input made: a walk of n steps decides.
    uint32_t first_kept(uint32_t id) const {
        for (size_t steps = 0; !kept[id] && steps < n; ++steps) id = eht[id].next_entry;
        return kept[id] ? id : EHT_ROOT_ID;
    }

    void shorten_chains() {
        for (size_t i = 1; i < n; ++i) {
            OPT_ASSERT(kept[i] || eht[i].kind == EHK_CLEANUP_END);
            eht[i].next_entry = first_kept(eht[i].next_entry);
        }
        for (NODE* call : calls) {
            call->set_eh_entry(first_kept(call->eh_entry()));
            used[call->eh_entry()] = true;
        }
        for (const auto& of_cleanup : calls_of_cleanup)
            for (NODE* call : of_cleanup) call->set_eh_entry(first_kept(call->eh_entry()));
    }

    // From the calls of the function on: what a clean-up that none of them leads to calls reaches nothing, and a handler
    // that it alone names has no block any more.
    void extend_used() {
        std::vector<uint32_t> waiting;
        auto use = [this, &waiting](uint32_t id) {
            if (!used[id]) waiting.push_back(id);
            used[id] = true;
        };
        for (uint32_t i = 0; i < n; ++i)
            if (used[i]) waiting.push_back(i);
        for (size_t k = 0; k < waiting.size(); ++k) {
            use(eht[waiting[k]].next_entry);
            for (const NODE* call : calls_of_cleanup[waiting[k]]) use(call->eh_entry());
        }
    }

    void compact() {
        std::vector<uint32_t> new_ids(n, 0);
        uint32_t count = 0;
        for (size_t i = 1; i < n; ++i)
            if (used[i]) new_ids[i] = ++count;
        if (count + 1 == n) return;
        for (NODE* call : calls) call->set_eh_entry(new_ids[call->eh_entry()]);
        for (const auto& of_cleanup : calls_of_cleanup) // of those that are removed too
            for (NODE* call : of_cleanup) call->set_eh_entry(new_ids[call->eh_entry()]);
        for (size_t i = 1; i < n; ++i) {
            if (!used[i]) {
                erase_tree(eht[i].cleanup);
                continue;
            }
            OPT_ASSERT(new_ids[eht[i].id] != 0);
            EHT_ITEM item = std::move(eht[i]);
            item.id = new_ids[item.id];
            item.next_entry = new_ids[item.next_entry];
            eht[new_ids[i]] = std::move(item);
        }
        eht.resize(count + 1);
    }

    FUNINFO* f;
    std::vector<EHT_ITEM>& eht;
    const size_t n;
    std::vector<bool> used, kept;
    std::vector<NODE*> calls;                         // of the function's statements
    std::vector<std::vector<NODE*>> calls_of_cleanup; // by entry
};

} // namespace

void prune_exception_table() { PRUNER(currfuninfo).run(); }
