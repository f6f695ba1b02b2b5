// Control: calls through addresses, promised trip counts.
#include "exec_unit.h"

namespace {
class ControlTest : public ExecTest {
protected:
    void place(uint32_t n) { file->if_write_label(n); }
    void go_to(uint32_t n) { statement(node(BRANCH, pkg.int_t, label(n))); }
    void unless(IC_NODE* condition, uint32_t n) { statement(node(CBRANCH, pkg.int_t, condition, label(n))); }
    void pragma(const char* name, std::vector<std::string> args) {
        pragmas.emplace_back(new PRAGMA);
        while (std::strcmp(PRAGMA::name(pragmas.back()->kind), name) != 0) pragmas.back()->kind++;
        pragmas.back()->args = std::move(args);
        file->if_write_pragma(pragmas.back().get());
    }
    // A function of one count, whose loop iterates that often: `while` tests first, `do` last, and a break leaves when
    // the counter is 9. The pragma stands before the loop.
    void promised(const char* keyword, std::vector<std::string> promise, int64_t count) {
        const bool last = std::strcmp(keyword, "do") == 0;
        IC_SYMBOL* f = global("_loop", function_type({pkg.int_t}, pkg.void_t));
        file->if_write_begin_func(f, &psn);
        IC_SYMBOL* n = parameter("n", pkg.int_t);
        file->if_write_end_args(&psn);
        IC_SYMBOL* i = local("i", pkg.int_t);
        body();
        statement(set(i, num(0, pkg.int_t)));
        pragma("SRC_LOOP", {"1", "i", "9", keyword});
        pragma("MUST_ITERATE", std::move(promise));
        place(1);
        if (!last) unless(node(LT, pkg.int_t, name(i), name(n)), 3);
        unless(node(EQ, pkg.int_t, name(i), num(9, pkg.int_t)), 2);
        go_to(3);
        place(2);
        statement(node(PLUSASG, pkg.int_t, name(i), num(1, pkg.int_t)));
        if (last) unless(node(LT, pkg.int_t, name(i), name(n)), 3);
        go_to(1);
        place(3);
        end();
        begin(main_sym);
        body();
        statement(call(f, num(count, pkg.int_t)));
        ret(0);
        end();
    }

    // The records of a function with one loop, and of where that begins.
    void told(uint32_t min, uint32_t max, uint32_t multiple, uint32_t outer = 0) {
        file->if_write_loop(0, 0, 1, 1, 1, 0);
        file->if_write_loop(1, outer, min, max, multiple, 0);
    }
    void loop(uint32_t id, uint32_t at) { file->if_write_inloop(id, nullptr, 0), place(at); }

    std::vector<std::unique_ptr<PRAGMA>> pragmas;
};

TEST_F(ControlTest, AddressOfNoFunctionIsReported) {
    TYPE* to = pkg.mk_ptr(function_type({}, pkg.int_t));
    begin(main_sym);
    IC_SYMBOL* p = local("p", to);
    body();
    statement(set(p, num(4096, to)));
    statement(node(UCALL, pkg.int_t, name(p)));
    expect_error(EXEC_BAD_ADDRESS, "no function");
}

struct PROMISE_ROW {
    const char* keyword;
    std::vector<std::string> promise;
    int64_t count;
    const char* fault; // null: the promise is kept
};
// The name of a row: a record shows nothing of itself but its bytes, which hold addresses.
void PrintTo(const PROMISE_ROW& row, std::ostream* out) {
    *out << row.keyword;
    for (const std::string& number : row.promise) *out << ' ' << (number.empty() ? "-" : number);
    *out << ", " << row.count << " iterations";
}
class PromiseTest : public ControlTest, public testing::WithParamInterface<PROMISE_ROW> {};

TEST_P(PromiseTest, IsHeldAgainstTheRun) {
    const PROMISE_ROW& row = GetParam();
    promised(row.keyword, row.promise, row.count);
    const EXEC_RESULT r = run(checked());
    EXPECT_EQ(r.status, row.fault ? int{EXEC_TRIPS} : 0) << r.error;
    if (!row.fault) return;
    EXPECT_NE(r.error.find(row.fault), std::string::npos) << r.error;
    EXPECT_NE(r.error.find("(in loop, line 2)"), std::string::npos) << r.error;
}
INSTANTIATE_TEST_SUITE_P(
    Loops, PromiseTest,
    testing::Values(PROMISE_ROW{"while", {"4", "8", ""}, 4, nullptr}, PROMISE_ROW{"while", {"4", "8", ""}, 8, nullptr},
                    PROMISE_ROW{"while", {"4", "8", ""}, 3, "iterated 3 times where at least 4 and at most 8 were"},
                    PROMISE_ROW{"while", {"", "4", ""}, 5, "at most 4"},
                    PROMISE_ROW{"while", {"1", "", ""}, 0, "0 times"}, PROMISE_ROW{"while", {"", "", "3"}, 6, nullptr},
                    PROMISE_ROW{"while", {"", "", "3"}, 0, nullptr},
                    PROMISE_ROW{"while", {"", "", "3"}, 7, "multiples of 3"},
                    PROMISE_ROW{"while", {"8", "4", ""}, 6, nullptr}, // contradicts itself
                    PROMISE_ROW{"do", {"1", "1", ""}, 0, nullptr}, PROMISE_ROW{"do", {"2", "", ""}, 1, "1 times"},
                    PROMISE_ROW{"do", {"", "4", "2"}, 4, nullptr},
                    // Left by the break in the tenth iteration, which counts either way.
                    PROMISE_ROW{"while", {"10", "", ""}, 20, nullptr}, PROMISE_ROW{"while", {"", "9", ""}, 20, nullptr},
                    PROMISE_ROW{"while", {"11", "", ""}, 20, "at least 11"}));

TEST_F(ControlTest, PromisesAreHeldOnlyOnRequest) {
    promised("while", {"4", "4", ""}, 5);
    EXPECT_EQ(run().status, 0);
}

// A function whose loop calls it again: each activation counts for itself, and each entry from the start. The promise
// is a loop record.
TEST_F(ControlTest, PromisesAreOfEachEntryAndActivation) {
    IC_SYMBOL* f = global("_nest", function_type({pkg.int_t}, pkg.void_t));
    file->if_write_begin_func(f, &psn);
    told(3, 3, 1);
    IC_SYMBOL* n = parameter("n", pkg.int_t);
    file->if_write_end_args(&psn);
    IC_SYMBOL* i = local("i", pkg.int_t);
    body();
    statement(set(i, num(3, pkg.int_t)));
    loop(1, 1);
    unless(name(n), 2);
    statement(call(f, node(MINUS, pkg.int_t, name(n), num(1, pkg.int_t))));
    place(2);
    statement(node(PLUSASG, pkg.int_t, name(i), num(-1, pkg.int_t)));
    unless(node(EQ, pkg.int_t, name(i), num(0, pkg.int_t)), 1);
    end();
    begin_main();
    for (int k = 0; k < 2; k++) statement(call(f, num(2, pkg.int_t)));
    ret(0);
    end();
    EXPECT_EQ(run(checked()).status, 0);
}

struct RECORD_ROW {
    uint32_t min, max, multiple, outer, of; // `of`: the id that the loop's statements have
    const char* fault;                      // null: the record is true of five iterations
};
void PrintTo(const RECORD_ROW& row, std::ostream* out) {
    *out << row.min << " to " << row.max << " by " << row.multiple << " in " << row.outer << " of " << row.of;
}
class RecordTest : public ControlTest, public testing::WithParamInterface<RECORD_ROW> {};

TEST_P(RecordTest, IsHeldAgainstTheRun) {
    const RECORD_ROW& row = GetParam();
    begin(main_sym);
    told(row.min, row.max, row.multiple, row.outer);
    IC_SYMBOL* i = local("i", pkg.uint_t);
    body();
    statement(set(i, num(4, pkg.uint_t)));
    loop(row.of, 1);
    statement(node(NOTB, pkg.uint_t, name(i)));
    statement(node(ENDLOOP, pkg.uint_t, name(i), label(1)));
    loop(0, 2);
    ret(0);
    if (row.fault) return expect_error(EXEC_TRIPS, row.fault, checked());
    end();
    EXPECT_EQ(run(checked()).status, 0);
}
INSTANTIATE_TEST_SUITE_P(Loops, RecordTest,
                         testing::Values(RECORD_ROW{5, 5, 5, 0, 1, nullptr}, RECORD_ROW{1, UINT32_MAX, 1, 0, 1, nullptr},
                                         RECORD_ROW{1, UINT32_MAX, 2, 0, 1, "iterated 5 times where at least 0 in multiples of 2"},
                                         RECORD_ROW{6, 9, 1, 0, 1, "at least 6"}, RECORD_ROW{0, 4, 1, 0, 1, "at most 4"},
                                         RECORD_ROW{0, 9, 0, 0, 1, "contradicts itself"}, RECORD_ROW{1, 9, 1, 0, 0, "has no record"},
                                         RECORD_ROW{1, 9, 1, 2, 1, "told to be in loop 2"}));

TEST_F(ControlTest, RecordsAreOfAllLoops) {
    begin(main_sym);
    told(1, 1, 1);
    body();
    ret(0);
    expect_error(EXEC_TRIPS, "1 loops are told of, and there are 0", checked());
}

// A loop that reads what it wrote two iterations before.
struct EDGE_ROW {
    uint8_t flags;
    DD_ENTRY of_loop;
    bool is_true;
};
void PrintTo(const EDGE_ROW& row, std::ostream* out) {
    *out << int(row.flags) << ' ' << int(row.of_loop.direction) << ' ' << int(row.of_loop.distance);
}
class EdgeTest : public ControlTest, public testing::WithParamInterface<EDGE_ROW> {};

TEST_P(EdgeTest, IsHeldAgainstTheRun) {
    const EDGE_ROW& row = GetParam();
    const DD_ENTRY elements[] = {{4, 0}, row.of_loop};
    TYPE* to = pkg.mk_ptr(pkg.int_t);
    IC_SYMBOL* a = global("_a", pkg.mk_array(pkg.int_t, false, 32, true));
    begin(main_sym);
    told(5, 5, 5);
    file->if_write_dep_vector(elements, 0, row.flags, 2);
    file->if_write_dep_edge(1, 2, 0);
    IC_SYMBOL *i = local("i", pkg.uint_t), *sum = local("sum", pkg.int_t);
    const auto access = [&](uint32_t id, int64_t offset) {
        IC_NODE* place = node(PLUS, to, node(PCONV, to, node(UAND, pkg.mk_ptr(a->type), name(a))), name(i));
        IC_NODE* mark = node(DDNODE, pkg.int_t, node(UMULT, pkg.int_t, node(PLUS, to, place, num(offset, pkg.int_t))));
        mark->number = id;
        return mark;
    };
    body();
    statement(set(i, num(4, pkg.uint_t)));
    loop(1, 1);
    statement(set(sum, access(2, 2)));
    statement(node(ASG, pkg.int_t, access(1, 0), name(sum)));
    statement(node(ENDLOOP, pkg.uint_t, name(i), label(1)));
    loop(0, 2);
    if (!row.is_true) return expect_error(EXEC_CHECK, "access 2 follows access 1 of line 3 without", checked());
    ret(0);
    end();
    EXPECT_EQ(run(checked()).status, 0);
}
INSTANTIATE_TEST_SUITE_P(Loops, EdgeTest,
                         testing::Values(EDGE_ROW{0, {9, 2}, true}, EDGE_ROW{8, {25, 1}, true}, EDGE_ROW{0, {14, 0}, true},
                                         EDGE_ROW{0, {9, 3}, false}, EDGE_ROW{0, {6, 0}, false}, EDGE_ROW{1, {8, 0}, false}));
} // namespace
