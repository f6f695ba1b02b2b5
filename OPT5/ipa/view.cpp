// The call graph as a file for a viewer of graphs: only looks.

#include "OPT5/ipa/view.h"

#include "OPT5/ipa/progana.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"

#include <cerrno>
#include <cstring>

namespace {

const char* title(const FUNINFO* f) { return f == program.file_fun ? "(outside)" : f->name.c_str(); }

std::string file_name() {
    const size_t slash = i_file_name.rfind('/'), dot = i_file_name.rfind('.');
    const bool has_suffix = dot != std::string::npos && (slash == std::string::npos || dot > slash);
    return (has_suffix ? i_file_name.substr(0, dot) : i_file_name) + ".gdl";
}

} // namespace

void view_call_graph() {
    const std::string name = file_name();
    FILE* out = std::fopen(name.c_str(), "w");
    if (!out) {
        std::fprintf(stderr, "cannot write %s: %s\n", name.c_str(), std::strerror(errno));
        return;
    }
    std::fprintf(out, "graph: { title: \"call graph of %s\"\n", i_file_name.c_str());
    for (FUNLIST* p = cg_list; p; p = p->next)
        std::fprintf(out, "node: { title: \"%s\" label: \"%d: %s\" }\n", title(p->fun), p->fun->cg_order,
                     title(p->fun));
    for (FUNLIST* p = cg_list; p; p = p->next)
        for (const CALLEE* c = p->fun->callees; c; c = c->next)
            if (c->callee->cg_order >= 0)
                std::fprintf(out, "edge: { sourcename: \"%s\" targetname: \"%s\" label: \"%d\" }\n", title(p->fun),
                             title(c->callee), c->ncalls);
    std::fputs("}\n", out);
    if (std::fclose(out) != 0) std::fprintf(stderr, "cannot write %s: %s\n", name.c_str(), std::strerror(errno));
}
