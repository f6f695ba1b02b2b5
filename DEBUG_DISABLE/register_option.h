// Internal switches: named integers spelled "debug:name", "enable:name" or "disable:name", 0 at start.
//
// Each switch is a global object in the code that reads it, and enters itself in one table when it is constructed.
#pragma once

#include <map>
#include <string>

class register_option {
public:
    explicit register_option(const char* switch_name);
    register_option(const register_option&) = delete;
    register_option& operator=(const register_option&) = delete;

    operator int() const { return value; }
    register_option& operator=(int v) {
        value = v;
        return *this;
    }
    const std::string& name() const { return name_m; }
    const std::string& text() const { return text_m; } // the value as it was written; empty without one

    static std::map<std::string, register_option*>& objects();
    static register_option* get_option(const std::string& name); // null if there is none
    static std::map<std::string, int> get_state();
    static void set_state(const std::map<std::string, int>& state);
    static void reset_state(); // all to 0
    static void dump();        // prints nothing

private:
    friend bool process_debug_option(const char* kind, const char* list);
    std::string name_m, text_m;
    int value = 0;
};

// Sets the switches of a comma-separated list: "name" or "name=value" with a value in C notation. `kind` is "debug",
// "enable" or "disable". A name that no switch has is ignored; true if there is none.
bool process_debug_option(const char* kind, const char* list);
