// Ends that the program did not plan: internal failures and signals.
#include "IFILE/ifile.h"
#include "OPT5/driver/driver.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "TYPES/type.h"
#include "UTIL/abort.h"
#include "UTIL/safemem.h"
#include "run.h"

#include <csignal>
#include <gtest/gtest.h>
#include <new>
#include <stdexcept>

namespace {

void enter_function() {
    static PSN psn{"unit.c", 3, 1};
    currfunc = new SYMTAB;
    currfunc->name = safestrdup("_work");
    currfuninfo = make_FUNINFO(currfunc);
    currfuninfo->begin_psn = &psn;
}

TEST(AbnormalEnd, NamesTheFunctionAndTheReason) {
    install_abort_behaviour();
    EXPECT_EXIT(abort_optimizer("the reason"), testing::ExitedWithCode(1),
                "\n>>>> Optimizer terminated abnormally\n\n>>>> the reason\\.\n");
    EXPECT_EXIT(
        {
            enter_function();
            abort_optimizer("the reason");
        },
        testing::ExitedWithCode(1), "in function _work\\(\\)\n>>>>    in file \"unit.c\"\n\n>>>> the reason\\.\n");
    EXPECT_EXIT(
        {
            enter_function();
            currfunc_at_abort = currfunc;
            currfunc = nullptr;
            abort_optimizer();
        },
        testing::ExitedWithCode(1), "in function _work\\(\\)\n");
    EXPECT_EXIT(
        {
            process_debug_option("debug", "abort");
            abort_optimizer();
        },
        testing::KilledBySignal(SIGABRT),
        "test case including ALL of the command-line options\\.\nInclude the \\.pp file");
}

TEST(AbnormalEnd, Signals) {
    struct ROW {
        int number;
        const char* text;
    };
    const ROW rows[] = {
        {SIGHUP, "^\\[tool forced exit\\]\n$"},
        {SIGINT, "^\\[tool forced exit\\]\n$"},
        {SIGTERM, "^\\[tool received a terminate signal\\]\n$"},
        {SIGILL, "INTERNAL ERROR: tool executed an illegal instruction\n"},
        {SIGTRAP, "received a TRAP signal\n"},
        {SIGABRT, "had an internal inconsistency and aborted\n"},
        {SIGBUS, "experienced a bus alignment fault\n"},
        {SIGFPE, "received a floating point exception\n"},
        {SIGSEGV, "experienced a segmentation fault\n                  while processing function _work file unit.c\n"},
        {SIGXCPU, "exceeded the CPU time limit\n"},
        {SIGXFSZ, "exceeded the file size limit\n"},
        {SIGSYS, "experienced a bad system call\n"},
    };
    for (const ROW& row : rows)
        EXPECT_EXIT(
            {
                install_common_handlers("tool", write_termination_notes);
                enter_function();
                raise(row.number);
            },
            testing::ExitedWithCode(2), row.text);
    EXPECT_EXIT(
        {
            install_common_handlers(nullptr, nullptr);
            raise(SIGSEGV);
        },
        testing::ExitedWithCode(2),
        "ERROR: unknown experienced.*\n *while processing function <unknown> file <unknown>\n");
}

// The files are open when the failure comes: what remains of the run is the message.
TEST(AbnormalEnd, FailureAfterTheFilesAreOpen) {
    WORKPLACE w;
    w.put("a.if", unit());
    struct ROW {
        void (*failure)();
        const char* err;
        bool is_defect;
    };
    const ROW rows[] = {
        {[] { throw std::bad_alloc(); }, "\n>>>> ERROR - OUT OF MEMORY.\n", true},
        {[] { throw std::runtime_error("odd"); }, "\n>>>> Exception:  odd.\n", true},
        {[] { throw 3; }, "\n>>>> Caught something that isn't std::exception..\n", true},
        {[] { optassert("x", "f", 1); }, ">>>> Optimizer terminated abnormally\n", true},
        {[] { throw if_error("bad word", 0x2a); }, "zopt: a.if: offset 0x2a: bad word\n", false},
        {[] { throw if_error("\nINTERNAL ERROR: x, aborting", 0x2a); },
         "\nINTERNAL ERROR: x, aborting\nzopt: a.if: offset 0x2a: not an acceptable I-file\n", false},
        {[] { throw tp_failure("bad type"); }, "TP>> internal error: bad type\nzopt: a.if: not an acceptable I-file\n",
         false},
    };
    static void (*failure)();
    for (const ROW& row : rows) {
        failure = row.failure;
        const RESULT r = w.run({}, {}, [] {
            install_abort_behaviour();
            run_guarded([] {
                char words[][8] = {"zopt", "-#1", "a.if", "b.if"};
                char* argv[] = {words[0], words[1], words[2], words[3]};
                open_files(4, argv);
                failure();
                return true;
            });
        });
        EXPECT_EQ(r.status, 1);
        EXPECT_NE(r.err.find(row.err), std::string::npos) << r.err;
        EXPECT_EQ(r.err.find("ENTIRE error message") != std::string::npos, row.is_defect) << r.err;
        EXPECT_FALSE(w.has("b.if"));
        EXPECT_EQ(w.get("a.odb").find("\n>>>> Optimizer terminated abnormally.\n") != std::string::npos, row.is_defect);
    }
}

} // namespace
