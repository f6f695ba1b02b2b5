// The tables of the option database, from their .def files.
#include "OPTIONS/option_obj.h"

#include <climits>

#define ITEMLIST(list) const option_obj::option_item option_obj::OO_##list##_ITEMLIST[] = {
#define ITEM(list, name, word, value) {word, value},
#define ITEMLIST_END                                                                                                   \
    { nullptr, 0 }                                                                                                     \
    }                                                                                                                  \
    ;
#include "OPTIONS/option_items.def"
#undef ITEMLIST_END
#undef ITEM
#undef ITEMLIST

// Columns of options.def.
#define F(...)                                                                                                         \
    { __VA_ARGS__ }
#define C(class_name) (1u << CLASS_##class_name)
#define NO_LIMIT INT_MAX

const option_obj::option_definition option_obj::option_definitions[OPTION_COUNT] = {
#define OPTION(id, name, forms, kind, items, arg_text, low, high, classes, merge, persistent, help)                    \
    {forms, arg_text, (kind) != PK_NONE, {help, nullptr}, {0, 0, persistent}, items, {low, high}},
#include "OPTIONS/options.def"
#undef OPTION
};

const option_obj::parm_kind option_obj::parm_type[OPTION_COUNT] = {
#define OPTION(id, name, forms, kind, items, arg_text, low, high, classes, merge, persistent, help) kind,
#include "OPTIONS/options.def"
#undef OPTION
};

const option_obj::merge_policy option_obj::merge_policies[OPTION_COUNT] = {
#define OPTION(id, name, forms, kind, items, arg_text, low, high, classes, merge, persistent, help) merge,
#include "OPTIONS/options.def"
#undef OPTION
};

const unsigned option_obj::classes[OPTION_COUNT] = {
#define OPTION(id, name, forms, kind, items, arg_text, low, high, classes, merge, persistent, help) classes,
#include "OPTIONS/options.def"
#undef OPTION
};

namespace {
constexpr int ids_in_order[] = {
#define OPTION(id, name, forms, kind, items, arg_text, low, high, classes, merge, persistent, help) id,
#include "OPTIONS/options.def"
#undef OPTION
};
constexpr bool every_row_stands_at_its_id() {
    for (int i = 0; i < option_obj::OPTION_COUNT; ++i)
        if (ids_in_order[i] != i) return false;
    return sizeof ids_in_order / sizeof *ids_in_order == option_obj::OPTION_COUNT;
}
static_assert(every_row_stands_at_its_id(), "the tables are indexed by id");

struct CONFLICT_ROW {
    int id, other, within, merged;
};
constexpr CONFLICT_ROW conflict_rows[] = {
#define CONFLICT(id, other, within, merged) {option_obj::OO_##id, option_obj::OO_##other, within, merged},
#include "OPTIONS/option_conflicts.def"
#undef CONFLICT
};

// The two matrices, 72 by 72, spread out from the rows.
struct CONFLICT_TABLES {
    unsigned char within[option_obj::OPTION_COUNT][option_obj::OPTION_COUNT];
    unsigned char merged[option_obj::OPTION_COUNT][option_obj::OPTION_COUNT];
};
constexpr CONFLICT_TABLES spread_conflicts() {
    CONFLICT_TABLES t{};
    for (const CONFLICT_ROW& row : conflict_rows) {
        t.within[row.id][row.other] = static_cast<unsigned char>(row.within);
        t.merged[row.id][row.other] = static_cast<unsigned char>(row.merged);
    }
    return t;
}
constexpr CONFLICT_TABLES conflict_tables = spread_conflicts();
} // namespace

int option_obj::conflicts(int id, int other) { return conflict_tables.within[id][other]; }
int option_obj::merge_conflicts(int id, int other) { return conflict_tables.merged[id][other]; }

const char* const option_obj::class_descriptions[CLASS_COUNT] = {
    "All options",
    "General",
    "Optimizer",
    "Optimization level and program mode",
    "Target",
    "Arithmetic",
    "Aliasing",
    "Inlining",
    "Loops",
    "Standard library",
    "Output and messages",
    "Debugging of the optimizer",
};

const char* option_obj::enum_to_optiontxt(int id) {
    const char* const name = valid(id) ? option_definitions[id].forms[0] : nullptr;
    return name ? name : "<internal>";
}

const char* option_obj::enum_to_enumtxt(int value) {
    static const option_item all_items[] = {
#define ITEMLIST(list)
#define ITEM(list, name, word, value) {word, value},
#define ITEMLIST_END
#include "OPTIONS/option_items.def"
#undef ITEMLIST_END
#undef ITEM
#undef ITEMLIST
    };
    for (const option_item& item : all_items)
        if (item.value == value) return item.word;
    return nullptr;
}

const char* option_obj::executable_name = "zopt";
const char* (*option_obj::next_arg)() = nullptr;
std::map<std::string, std::string> option_obj::tool_cmd_map = {{"optimizer", "zopt"}};
std::map<std::string, std::vector<std::string>> option_obj::tn_fileopt_map;
