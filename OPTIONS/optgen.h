// The reports of the option database, a class each, over the message layer.
#pragma once

#include "DIAG/diagnostic.h"

namespace DIAG {

// name(file, line, parameters...): the row's format filled with the parameters.
#define OPTGEN_CLASS(name, code, parameters, ...)                                                                      \
    class name : public text_message {                                                                                 \
    public:                                                                                                            \
        name parameters : text_message(code, file, line, fill(code, ##__VA_ARGS__)) {}                                 \
        DIAGNOSTIC* alloc() const override { return new name(*this); }                                                 \
    };
#define ARGS(...) (const char* file, unsigned line, __VA_ARGS__)
OPTGEN_CLASS(invalid_option, 6006, ARGS(const char* option), option)
OPTGEN_CLASS(optgen_conflict_option, 24002, ARGS(const char* option, const char* other), option, other)
OPTGEN_CLASS(optgen_conflict_override_option, 24003, ARGS(const char* option, const char* other), option, other)
OPTGEN_CLASS(optgen_conflict_quiet_option, 24004, ARGS(const char* option, const char* other), option, other)
OPTGEN_CLASS(optgen_clear_persistent, 24006, ARGS(const char* option), option)
OPTGEN_CLASS(optgen_unhandled_clause_in_setarg, 24007, ARGS(unsigned id), id)
OPTGEN_CLASS(optgen_unhandled_option_handler, 24008, ARGS(unsigned id), id)
OPTGEN_CLASS(optgen_invalid_list_handler, 24009, ARGS(unsigned id), id)
OPTGEN_CLASS(optgen_missing_parameter, 24010, ARGS(const char* option, const char* parameter), option, parameter)
OPTGEN_CLASS(optgen_arg_out_of_range, 24011, ARGS(const char* option, const char* text), option, text)
OPTGEN_CLASS(optgen_arg_out_of_range_non_neg, 24012, ARGS(const char* option, const char* text), option, text)
OPTGEN_CLASS(optgen_arg_out_of_range2, 24013, ARGS(const char* option, const char* text, unsigned low, unsigned high),
             option, text, low, high)
OPTGEN_CLASS(optgen_option_handler_corruption, 24014, (const char* file, unsigned line))
OPTGEN_CLASS(optgen_bad_argument, 24015, ARGS(const char* option, const char* words), option, words)
OPTGEN_CLASS(optgen_case_insensitivity_deprecated, 24016, ARGS(const char* written, const char* spelling), written,
             spelling)
OPTGEN_CLASS(optgen_exact_set_in_previous_files, 24020, ARGS(const char* option, const char* in_file), option, in_file)
OPTGEN_CLASS(optgen_exact_not_set_in_previous_files, 24021, ARGS(const char* option, const char* in_file), option,
             in_file)
OPTGEN_CLASS(optgen_exact_args_incompatible, 24022, ARGS(const char* option, const char* in_file, const char* other),
             option, in_file, other)
OPTGEN_CLASS(optgen_merge_conflict_option, 24023, ARGS(const char* option, const char* in_file, const char* other),
             option, in_file, other)
OPTGEN_CLASS(optgen_unhandled_clause_in_add_hist, 24031, ARGS(unsigned id), id)
OPTGEN_CLASS(optgen_missing_fileopt, 24032, ARGS(const char* tool), tool)
#undef ARGS
#undef OPTGEN_CLASS

} // namespace DIAG
