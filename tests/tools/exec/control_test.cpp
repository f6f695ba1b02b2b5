// Control: switches, calls through addresses, arguments without names, promised trip counts.
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
    // f(x) is a switch over these values; case k returns k + 1, and no case 0.
    IC_SYMBOL* chooser(TYPE* type, const std::vector<int64_t>& values, bool with_default) {
        IC_SYMBOL* f = global("_choose", function_type({type}, pkg.int_t));
        file->if_write_begin_func(f, &psn);
        IC_SYMBOL* x = parameter("x", type);
        file->if_write_end_args(&psn);
        body();
        std::vector<IC_NODE*> cases;
        for (size_t i = 0; i < values.size(); i++)
            cases.push_back(node(CASE, pkg.void_t, num(values[i], type), label(static_cast<uint32_t>(i + 1))));
        if (with_default) cases.insert(cases.begin(), node(DEFAULT, pkg.void_t, label(100)));
        IC_NODE* s = node(SWITCH, pkg.void_t, name(x), list(cases));
        s->number = static_cast<uint32_t>(cases.size());
        statement(s);
        auto give = [&](int64_t v) { statement(node(RETURN, pkg.int_t, name(f), num(v, pkg.int_t))); };
        give(0);
        for (size_t i = 0; i < values.size(); i++) {
            place(static_cast<uint32_t>(i + 1));
            give(static_cast<int64_t>(i + 1));
        }
        place(100);
        give(-1);
        end();
        return f;
    }
    void choose(TYPE* type, const std::vector<int64_t>& values, bool with_default, const std::vector<int64_t>& tried,
                const std::string& expected) {
        IC_SYMBOL* f = chooser(type, values, with_default);
        begin(main_sym);
        body();
        for (int64_t v : tried) put(call(f, num(v, type)));
        ret(0);
        end();
        expect_output(expected);
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

    std::vector<std::unique_ptr<PRAGMA>> pragmas;
};

TEST_F(ControlTest, DenseSwitch) { choose(pkg.int_t, {0, 1, 2, 3, 4}, true, {-1, 0, 3, 4, 5}, "-1\n1\n4\n5\n-1\n"); }
TEST_F(ControlTest, SparseSwitchOfLongsWithoutDefault) {
    choose(pkg.long_t, {2147483647, -2147483648LL, 65536, 0}, false, {-2147483648LL, 0, 1, 65536, 2147483647},
           "2\n4\n0\n3\n1\n");
}
TEST_F(ControlTest, SwitchOfUnsignedValues) {
    choose(pkg.uint_t, {65535, 32768, 1}, true, {65535, 32768, 32767, 1}, "1\n2\n-1\n3\n");
}

TEST_F(ControlTest, CallsGoThroughAddresses) {
    TYPE* type = function_type({pkg.int_t}, pkg.int_t);
    TYPE *to = pkg.mk_ptr(type), *table_type = pkg.mk_array(to, false, 2, true);
    IC_SYMBOL* table = global("_table", table_type);
    std::vector<IC_SYMBOL*> functions;
    for (const char* called : {"_twice", "_square"}) {
        IC_SYMBOL* f = functions.emplace_back(global(called, type));
        file->if_write_begin_func(f, &psn);
        IC_SYMBOL* x = parameter("x", pkg.int_t);
        file->if_write_end_args(&psn);
        body();
        IC_NODE* by = functions.size() == 1 ? num(2, pkg.int_t) : name(x);
        statement(node(RETURN, pkg.int_t, name(f), node(MULT, pkg.int_t, name(x), by)));
        end();
    }
    begin(main_sym);
    body();
    for (int k : {1, 0}) {
        TYPE* to_entry = pkg.mk_ptr(to);
        IC_NODE* at = node(PCONV, to_entry, node(UAND, pkg.mk_ptr(table_type), name(table)));
        IC_NODE* entry = node(UMULT, to, node(PLUS, to_entry, at, num(2 * k, pkg.long_t)));
        put(node(CALL, pkg.int_t, entry, num(-7, pkg.int_t)));
    }
    ret(0);
    end();
    initialize(table, {node(UAND, to, name(functions[0])), node(UAND, to, name(functions[1]))});
    expect_output("49\n-14\n");
}

TEST_F(ControlTest, AddressOfNoFunctionIsReported) {
    TYPE* to = pkg.mk_ptr(function_type({}, pkg.int_t));
    begin(main_sym);
    IC_SYMBOL* p = local("p", to);
    body();
    statement(set(p, num(4096, to)));
    statement(node(UCALL, pkg.int_t, name(p)));
    end();
    expect_error(EXEC_BAD_ADDRESS, "no function");
}

// Arguments beyond the named ones lie behind the last of these, each at its type's alignment; called directly and
// through an address.
TEST_F(ControlTest, ArgumentsWithoutNamesLieBehindTheLastNamedOne) {
    TYPE* type = function_type({pkg.int_t, pkg.long_t}, pkg.void_t, true);
    IC_SYMBOL* f = global("_show", type);
    file->if_write_begin_func(f, &psn);
    IC_SYMBOL *first = parameter("first", pkg.int_t), *last = parameter("last", pkg.long_t);
    file->if_write_end_args(&psn);
    IC_SYMBOL* own = local("own", pkg.llong_t);
    body();
    statement(set(own, num(-1, pkg.llong_t)));
    auto behind = [&](TYPE* t, int64_t units) {
        IC_NODE* at = node(PCONV, pkg.mk_ptr(t), node(UAND, pkg.mk_ptr(pkg.long_t), name(last)));
        return node(UMULT, t, node(PLUS, pkg.mk_ptr(t), at, num(units, pkg.long_t)));
    };
    put(name(first));
    put(name(last));
    put(behind(pkg.int_t, 2));
    put(behind(pkg.long_t, 4));
    put(behind(pkg.int_t, 6));
    put(behind(pkg.llong_t, 8));
    put(behind(pkg.int_t, 12));
    put(name(own));
    end();
    begin(main_sym);
    IC_SYMBOL* p = local("p", pkg.mk_ptr(type));
    local("filler", pkg.long_t); // so that the guard is right above the callee's arguments
    IC_SYMBOL* guard = local("guard", pkg.llong_t);
    body();
    statement(set(guard, num(77, pkg.llong_t)));
    auto arguments = [&] {
        return list({num(2, pkg.int_t), num(100000, pkg.long_t), num(-3, pkg.int_t), num(400000, pkg.long_t),
                     num(5, pkg.int_t), num(6000000000LL, pkg.llong_t), num(7, pkg.int_t)});
    };
    statement(call(f, arguments()));
    statement(set(p, node(UAND, p->type, name(f))));
    statement(node(CALL, pkg.void_t, name(p), arguments()));
    put(name(guard));
    ret(0);
    end();
    const std::string once = "2\n100000\n-3\n400000\n5\n6000000000\n7\n-1\n";
    expect_output(once + once + "77\n");
}

struct PROMISE_ROW {
    const char* keyword;
    std::vector<std::string> promise;
    int64_t count;
    const char* fault; // null: the promise is kept
};
class PromiseTest : public ControlTest, public testing::WithParamInterface<PROMISE_ROW> {};

TEST_P(PromiseTest, IsHeldAgainstTheRun) {
    const PROMISE_ROW& row = GetParam();
    promised(row.keyword, row.promise, row.count);
    EXEC_OPTIONS options;
    options.check = true;
    const EXEC_RESULT r = run(options);
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
    IC_SYMBOL* n = parameter("n", pkg.int_t);
    file->if_write_end_args(&psn);
    IC_SYMBOL* i = local("i", pkg.int_t);
    body();
    statement(set(i, num(3, pkg.int_t)));
    file->if_write_loop(1, 0, 3, 3, 0, 0);
    place(1);
    unless(name(n), 2);
    statement(call(f, node(MINUS, pkg.int_t, name(n), num(1, pkg.int_t))));
    place(2);
    statement(node(PLUSASG, pkg.int_t, name(i), num(-1, pkg.int_t)));
    unless(node(EQ, pkg.int_t, name(i), num(0, pkg.int_t)), 1);
    end();
    begin(main_sym);
    body();
    for (int k = 0; k < 2; k++) statement(call(f, num(2, pkg.int_t)));
    ret(0);
    end();
    EXEC_OPTIONS options;
    options.check = true;
    EXPECT_EQ(run(options).status, 0);
}

TEST_F(ControlTest, LoopRecordsPromise) {
    begin(main_sym);
    IC_SYMBOL* i = local("i", pkg.uint_t);
    body();
    statement(set(i, num(4, pkg.uint_t)));
    file->if_write_loop(1, 0, 1, UINT32_MAX, 2, 0);
    place(1);
    statement(node(NOTB, pkg.uint_t, name(i)));
    statement(node(ENDLOOP, pkg.uint_t, name(i), label(1)));
    ret(0);
    end();
    EXEC_OPTIONS options;
    options.check = true;
    expect_error(EXEC_TRIPS, "iterated 5 times where at least 1 in multiples of 2", options);
}
} // namespace
