// option_obj: the options of one run or of one option set of the I-file.
//
// What an option is called, what it takes and whom it conflicts with stands in options.def, option_items.def and
// option_conflicts.def. An object knows which options are present, their arguments and the order of events. It can give
// back what it holds as option words, which a second object parses to the same state.
#pragma once

#include "DIAG/diagnostic.h"

#include <array>
#include <list>
#include <map>
#include <string>
#include <utility>
#include <vector>

class option_obj {
public:
    enum option_id : int {
#define OPTION(id, name, forms, kind, items, arg_text, low, high, classes, merge, persistent, help) OO_##name = id,
#include "OPTIONS/options.def"
#undef OPTION
    };
    static constexpr int OPTION_COUNT = 72;

    // Values of enumerated options, distinct over all item lists.
    enum option_value : int {
#define ITEMLIST(list)
#define ITEM(list, name, word, value) OV_##list##_##name = value,
#define ITEMLIST_END
#include "OPTIONS/option_items.def"
#undef ITEMLIST_END
#undef ITEM
#undef ITEMLIST
    };

    enum parm_kind : int {
        PK_NONE = 0,
        PK_STRING = 1,
        PK_NUMBER = 2,
        PK_UNSIGNED = 3,
        PK_ENUM = 4,
        PK_STRING_LIST = 5,
        PK_NUMBER_LIST = 6,
        PK_UNSIGNED_LIST = 7,
    };

    // How the text of an argument is found and read: attached to the option or in the next word, or only attached.
    enum parse_option_type : int {
        PT_NUM = 0,
        PT_UNUM = 1,
        PT_NUM_LIST = 2,
        PT_STRING = 3,
        PT_ONEOF = 4,
        PT_UNUM_LIST = 5,
        PT_STRING_LIST = 8,
        PT_ATTACHED_NUM = 9,
        PT_ATTACHED_UNUM = 10,
        PT_ATTACHED_NUM_LIST = 11,
        PT_ATTACHED_STRING = 12,
        PT_ATTACHED_ONEOF = 13,
        PT_ATTACHED_UNUM_LIST = 14,
        PT_ATTACHED_STRING_LIST = 17,
    };

    // Whom an option is for; bits of a mask, numbered from 1. Class 0 stands for all.
    enum class_id : int {
        CLASS_ALL = 0,
        CLASS_GENERAL = 1,
        CLASS_OPTIMIZER = 2, // what the I-file's option sets and the command line say to this program
        CLASS_LEVEL = 3,
        CLASS_TARGET = 4,
        CLASS_FLOAT = 5,
        CLASS_ALIAS = 6,
        CLASS_INLINE = 7,
        CLASS_LOOP = 8,
        CLASS_LIBRARY = 9,
        CLASS_OUTPUT = 10,
        CLASS_DEBUG = 11,
        CLASS_COUNT = 12,
    };

    enum merge_policy : int {
        merge_policy_none,
        merge_policy_exact,
        merge_policy_exact_notset,
        merge_policy_or,
        merge_policy_and,
        merge_policy_max,
        merge_policy_min,
        merge_policy_main,
        merge_policy_custom,
    };

    struct option_item {
        const char* word; // null ends a list
        int value;
    };
    struct arg_range {
        long low, high;
    };
    struct option_definition {
        const char* forms[10]; // spellings with their hyphens, primary first, the rest null
        const char* arg_text;  // the argument's name in messages and help
        bool has_arg;
        const char* help[2];    // one line; a longer text or null
        unsigned char flags[8]; // [2]: persistent, cannot be cleared
        const option_item* items;
        arg_range range;
    };

    struct argument {
        std::string word;
        long number = 0;
    };
    struct event {
        int id;
        std::string text;
    };

    // ---- Tables
    static const option_definition option_definitions[OPTION_COUNT]; // no forms: no such word
    static const parm_kind parm_type[OPTION_COUNT];
    static const merge_policy merge_policies[OPTION_COUNT];
    static const unsigned classes[OPTION_COUNT]; // bit n: class n
    static const char* const class_descriptions[CLASS_COUNT];
#define ITEMLIST(list) static const option_item OO_##list##_ITEMLIST[];
#define ITEM(list, name, word, value)
#define ITEMLIST_END
#include "OPTIONS/option_items.def"
#undef ITEMLIST_END
#undef ITEM
#undef ITEMLIST
    static int conflicts(int id, int other);       // 0 none, 1 clears in silence, 2 with a warning, 3 an error
    static int merge_conflicts(int id, int other); // the same between two objects

    static const char* enum_to_optiontxt(int id);  // the primary name, "<internal>" for what is no option word
    static const char* enum_to_enumtxt(int value); // the word of an item's value, null if there is none

    // ---- The program that parses
    static const char* executable_name;
    static const char* (*next_arg)();                                      // next word of the command line, or null
    static std::map<std::string, std::string> tool_cmd_map;                // tool to its command
    static std::map<std::string, std::vector<std::string>> tn_fileopt_map; // tool to options given for it

    explicit option_obj(bool check_conflicts = true) : no_conflicts(!check_conflicts) {}

    // ---- Parsing. `word` is the option less its first hyphen.
    // True when the whole word was consumed; otherwise `*rest`, if given, is the place that no option accepts.
    bool process_option(const char* word, const char** rest);
    // Reads and stores the argument of option `id`. `text` is what follows the option's name. Ends the run with status
    // 1 on an argument that is missing or not acceptable.
    void parse_arg(int id, const char* text, const char* option_name, parse_option_type type, const arg_range* range);
    void parse_oneof(int id, const char* text, const char* option_name);
    void check_numerical_arg(int id, const char* text, const char* option_name, bool is_signed, const arg_range* range);
    static int get_radix(const char* text); // 16 behind "0x", 2 behind "0b", 8 behind "0", else 10
    static bool strtol_by_radix(const char* text, long* value);
    static bool strtoul_by_radix(const char* text, unsigned long* value);
    // Warns when the option word that begins at `written` differs from its spelling.
    void deprecated_case(const char* written, const char* spelling);
    std::string origin;       // where the words stand, for messages; empty for the command line
    bool help_allowed = true; // `--help` and its kin print and end the run; elsewhere they are no options

    // ---- Setting
    void setopt(int id);
    void setopt(int id, long value);
    void setopt(int id, const char* value);
    void setopt_internal(int id); // without conflicts and history
    void setarg(int id, long value);
    void setarg(int id, const char* value);
    void clearopt(int id);
    void clear_conflicting(int id); // every option that conflicts with `id` in any degree, in silence
    void setclassmembers(class_id c); // options without argument
    void clearclassmembers(class_id c);
    void parsed_option(int id, int form = 0); // marks that the parser saw it
    void addfileopt(const char* tool, const char* option);
    void clear_history(int id);

    // ---- Reading
    bool getopt(int id) const { return valid(id) && state[id] > 0; }
    long getnumarg(int id, unsigned index = 0) const;        // 0 if there is none
    const char* getstrarg(int id, unsigned index = 0) const; // null if there is none
    unsigned getargcount(int id) const;
    static bool isclass(int id, class_id c);
    bool testclass(class_id c) const; // any member present
    bool seenclass(class_id c) const; // any member seen by the parser
    static std::vector<int> class_list_for_option(int id);
    const std::list<event>& events() const { return history; }

    // ---- Export
    // The option as the user would write it; null text (false) if it is absent or has no such argument.
    bool export_option(int id, unsigned index, std::string* text) const;
    // `type` 0 takes everything present, 1 only what was cleared and set again.
    std::vector<std::string> export_option_list(int type) const { return export_option_class(type, CLASS_ALL); }
    std::vector<std::string> export_option_class(int type, class_id c) const;
    std::vector<std::pair<int, std::string>> export_option_pairs(int type, class_id c) const;
    static std::string internal_option_string(int id); // the primary name less its first hyphen
    std::string format_of_option(int id) const;        // the form that the user wrote, or the primary one
    static std::string get_opt_txt(int id);            // "--name=ARG" and the short forms

    // ---- Merging the options of several files
    void merge_init(const option_obj& main_object, const char* file);
    void merge_options(const option_obj& other, const char* file);
    void do_merge_conflicts(int id, const option_obj& other, const char* file);

    // ---- Output
    void print() const;       // as option words, one a line, on standard output
    void dump(int all) const; // names, states and arguments on standard output; `all`: absent options too
    void dump_history() const;
    static void display_option_help(int, int, int);
    static void dump_class(class_id help_class);
    static void dump_basic_class() { dump_class(CLASS_GENERAL); }
    void debug_level(int level) { debug = level != 0; }
    // Ends the run with status 1 when errors were counted.
    static void post_process_option_depends();
    // Rotates letters by 13 and exchanges "-" and "%". The result lives in one of five buffers used in turn.
    static const char* rot13(const char* text);

    bool no_conflicts = false; // conflicts are not checked while set

private:
    void report(DIAGNOSTIC&& message) const;
    [[noreturn]] void report_and_exit(DIAGNOSTIC&& message) const;
    static bool valid(int id) { return id >= 0 && id < OPTION_COUNT; }
    const char* parse_one(const char* word);
    void store(int id, const argument& arg);
    void first_argument(int id);
    void do_conflicts(int id);
    void add_to_history(int id, const std::string& text = std::string());
    void merge_one(int id, const option_obj& other, const char* file);
    void merge_by_order(int id, const option_obj& other, bool greater);
    void copy_option(int id, const option_obj& other);
    static long rank(int id, long value);

    bool debug = false;
    std::array<int, OPTION_COUNT> state{};
    std::array<unsigned char, OPTION_COUNT> seen_by_parse{}; // 1 above the index of the form
    std::array<int, OPTION_COUNT> clear_count{};             // times cleared or given an argument first
    std::array<std::vector<argument>, OPTION_COUNT> args;
    std::string current_word = "<internal>";
    std::list<event> history;
};
