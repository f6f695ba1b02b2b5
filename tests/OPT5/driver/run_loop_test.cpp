// The function loop over steps that record what runs, barriers, functions that leave work and come back, workers.
#include "OPT5/driver/driver.h"
#include "OPT5/driver/passes.h"
#include "OPT5/ir/funinfo.h"
#include "OPT5/ir/global.h"
#include "UTIL/safemem.h"
#include "run.h"

#include <gtest/gtest.h>
#include <stdexcept>

namespace {

std::string trace;

void note(const char* step) {
    trace += (trace.empty() ? "" : " ") + std::string(step) + (currfunc ? currfunc->name : "");
}
bool is(const char* name) { return currfunc && std::string(currfunc->name) == name; }

SYMTAB* function(const char* name) {
    auto* sym = new SYMTAB;
    sym->name = safestrdup(name);
    make_FUNINFO(sym);
    return sym;
}
SYMTAB* sleeper = nullptr;

void step_1() { note("1"); }
void step_2() {
    note("2");
    if (is("b") && sleeper) {
        unsuppressed_functions.push_back(sleeper);
        sleeper = nullptr;
    }
}
void step_3() { note("3"); }
void barrier_1() { note("B1"); }
void put_c_to_sleep() {
    note("S");
    sleeper = functions.back();
    functions.pop_back();
}
void write_function() { note("W"); }

class RunLoop : public testing::Test {
protected:
    void SetUp() override {
        trace.clear();
        sleeper = nullptr;
        normal_order.clear();
        permuted_order.clear();
        functions.clear();
        for (const char* name : {"a", "b", "c"}) functions.push_back(function(name));
    }
    void TearDown() override { functions.clear(); }
    static void add(void (*action)()) { permuted_order.push_back(new pass("step", action)); }
    static void add_barrier(void (*action)()) { permuted_order.push_back(new barrier_pass("barrier", action)); }
};

TEST_F(RunLoop, UnsuppressedFunctionTakesPartInTheNextBarrier) {
    add_barrier(put_c_to_sleep);
    add(step_2);
    add_barrier(barrier_1);
    add(step_3);
    run_functions(write_function);
    EXPECT_EQ(trace, "S 2a 2b 2c B1 3a Wa 3b Wb 3c Wc");
}

TEST_F(RunLoop, OneWorkerKeepsTheOrderAndWritesAtTheEnd) {
    add(step_1);
    add_barrier(barrier_1);
    add(step_3);
    max_threads = 1; // more would share `currfunc`
    run_functions(write_function);
    max_threads = 0;
    EXPECT_EQ(trace, "1a 1b 1c B1 3a 3b 3c Wa Wb Wc");
}

TEST_F(RunLoop, ExceptionInAWorkerStopsTheQueue) {
    add([] {
        note("1");
        if (is("b")) throw std::runtime_error("b fails");
    });
    max_threads = 1;
    EXPECT_THROW(run_functions(write_function), std::runtime_error);
    max_threads = 0;
    EXPECT_EQ(trace, "1a 1b");
    ASSERT_NE(currfunc_at_abort, nullptr);
    EXPECT_STREQ(currfunc_at_abort->name, "b");
    EXPECT_TRUE(functions_queue.empty());
    currfunc_at_abort = nullptr;
    currfunc = nullptr;
    currfuninfo = nullptr;
}

TEST(WholeRun, WorkerWritesTheSameBytes) {
    WORKPLACE w;
    w.put("a.if", unit({}, 5));
    const std::vector<std::string> words = {"-o3", "-n1", "a.if", "b.if"};
    ASSERT_EQ(w.run(words).status, 0);
    const std::string serial = w.get("b.if"), info = w.get("a.nfo");
    EXPECT_NE(serial.find("_f4"), std::string::npos);
    const RESULT r = w.run(words, {}, [] { max_threads = 1; });
    ASSERT_EQ(r.status, 0) << r.err;
    EXPECT_EQ(w.get("b.if"), serial);
}

} // namespace
