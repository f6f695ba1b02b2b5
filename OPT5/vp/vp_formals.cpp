// Values that all calls together pass in parameters, for the whole run: entered once, before the functions are worked on.
#include "OPT5/vp/vp_eval.h"

#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "UTIL/abort.h"

#include <algorithm>
#include <cstdio>
#include <map>

namespace {
std::map<std::pair<uint32_t, std::string>, vpset> formal_values; // by the function's number and the parameter's name; looked up
}

void enter_vpset_of_formal_parm(const FUNINFO* f, const std::string& parm, const vpset& set) { formal_values[{f->uid, parm}] = set; }

bool find_vpset_in_formal_parms(vpset* out, const SYMTAB* sym) {
    if (sym->level != 1 || opt_level() < 3 || formal_values.empty()) return false;
    const std::vector<FPARM>& ring = currfuninfo->formals;
    if (ring.empty()) return false;
    if (std::none_of(ring.begin(), ring.end(), [sym](const FPARM& p) { return p.name == sym->name; })) {
        std::fputs("\n!!! COMPILER (OPTIMIZER) ERROR IN 'ddvp'!!!\n", stderr);
        abort_optimizer("a parameter without a record");
    }
    auto at = formal_values.find({currfuninfo->uid, sym->name});
    if (at == formal_values.end()) return false;
    *out = at->second;
    return true;
}
