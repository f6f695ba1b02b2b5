// The order of a run, and the rule for everything that can go wrong in it.
#include "BANNER/banner.h"
#include "IFILE/ifile.h"
#include "OPT5/dd/dd.h"
#include "OPT5/driver/driver.h"
#include "OPT5/driver/passes.h"
#include "OPT5/io/write.h"
#include "OPT5/ipa/inline.h"
#include "OPT5/ipa/positions.h"
#include "OPT5/ipa/progana.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "OPT5/ir/opcodes.h"
#include "OPT5/ir/symtab.h"
#include "OPT5/ir/type_ops.h"
#include "OPT5/md/matcher.h"
#include "OPT5/scalar/eda.h"
#include "OPT5/simp/simp.h"
#include "OPT5/target/bif.h"
#include "OPT5/target/target.h"
#include "OPT5/vp/vp.h"
#include "TYPES/type.h"
#include "UTIL/abort.h"
#include "UTIL/big_stack.h"

#include <csignal>
#include <cstdlib>
#include <ctime>
#include <new>

register_option enable_time_stats("enable:time_stats");

namespace {

constexpr std::size_t RUN_STACK = std::size_t(1) << 30; // tree walks recurse; IF_MAX_TREE_DEPTH levels must fit

register_option pass_debug_parser("debug:parser");

clock_t start_time;

// From the input to written functions. False: the machine description was checked and nothing else.
bool optimize_unit(int argc, char** argv) {
    open_files(argc, argv);
    init_opcode_tables();
    init_target();
    TYPE_PKG::cpu_version = cpu_version;
    init_types();
    init_symbols();
    init_fileopts();
    init_BIF_descriptors();
    init_simplifier();
    install_value_propagation();
    setup_passes(true);
    if (pass_debug_parser) {
        parse_md_file(false);
        return false;
    }
    if (print_debug || enable_time_stats) start_time = std::clock();
    if (print_debug) do_DVE_unit_testing();
    i_file->if_read_file();
    if (functions.empty()) {
        currfunc = nullptr;
        currfuninfo = nullptr;
        analyze_global_symbols();
    } else {
        run_functions(output_function);
        dump_psnrefs();
        dump_psnmap();
    }
    return true;
}

// What is wrong with the input, and where. A text with its own form stands as it is on a line ahead of the place.
[[noreturn]] void report_bad_input(const std::string& text, long offset) {
    char place[40] = "";
    if (offset >= 0) std::snprintf(place, sizeof place, "offset 0x%lx: ", offset);
    const bool own_form = !text.empty() && (text[0] == '\n' || text.compare(0, 4, "TP>>") == 0);
    const std::string where = "zopt: " + i_file_name + ": " + place;
    fail_run(own_form ? text + (text.back() == '\n' ? "" : "\n") + where + "not an acceptable I-file" : where + text);
}

} // namespace

bool run_guarded(const std::function<bool()>& work) {
    try {
        return work();
    } catch (const if_error& e) {
        report_bad_input(e.what(), e.offset());
    } catch (const tp_failure& e) {
        report_bad_input(e.what(), -1);
    } catch (const std::bad_alloc&) {
        abort_optimizer("ERROR - OUT OF MEMORY");
    } catch (const std::exception& e) {
        abort_optimizer((std::string("Exception:  ") + e.what()).c_str());
    } catch (...) {
        abort_optimizer("Caught something that isn't std::exception.");
    }
}

namespace {

void release_types() {
    if (TYPE_PKG::tp_count - 1 == 0) tp->delete_type_tree(TYPE_PKG::root_type, 1, 0);
    delete tp;
    tp = nullptr;
}

void run(int argc, char** argv) {
    if (!run_guarded([&] { return optimize_unit(argc, argv); })) {
        discard_output();
        std::exit(0);
    }
    run_guarded([] {
        write_end_of_unit();
        interned_stats();
        type_cache_stats();
        return true;
    });
    if (print_debug || enable_time_stats) report_times(std::clock() - start_time);
    close_files();
    release_types();
    std::exit(0);
}

} // namespace

int zopt_main(int argc, char** argv) {
    // A reader of our standard output that closes early is no reason to leave half an output file.
    std::signal(SIGPIPE, SIG_IGN);
    register_reserved_switches();
    install_abort_behaviour();
    run_on_big_stack(RUN_STACK, [&] { run(argc, argv); });
    return 0;
}
