// The numbered steps that are run on every function, and the order they run in.
#pragma once

#include "OPT5/driver/pipeline.h"
#include "OPT5/ir/serial_object.h"

#include <cstdio>
#include <string>
#include <vector>

class pass;
class pass_manager : public serial_namespace<pass, pass_manager> {};
extern pass_manager global_pass_manager;

// A step. A step whose condition does not hold is entered, dumped and timed all the same.
class pass : public serial_object<pass, pass_manager> {
public:
    const ROW row;
    const std::string name;

    explicit pass(const ROW& step) : serial_object(&global_pass_manager), row(step), name(step.name) {}
    pass(const char* step_name, void (*step_action)())
        : pass(ROW{ROW::FUNCTION, step_name, nullptr, nullptr, step_action, fact::none, fact::none}) {}
    virtual ~pass() = default;
    virtual bool is_barrier() const { return false; }
    void run();
};

// A step that works on the whole program, once, when every function has come to it.
class barrier_pass final : public pass {
public:
    using pass::pass;
    bool is_barrier() const override { return true; }
};

extern std::vector<pass*> normal_order;   // in order of creation
extern std::vector<pass*> permuted_order; // the order that is run

// Makes all steps. `use_forced`: an order that the options or the environment ask for becomes `permuted_order`.
void setup_passes(bool use_forced);
void list_passes(FILE* out);

// The table: all steps but "output function" in order, and of them those that work on loops (28 to 60).
void add_normal_order_passes(std::vector<pass*>& order);
void add_dd_normal_order_passes(std::vector<pass*>& order);
