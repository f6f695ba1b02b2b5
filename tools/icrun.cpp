// icrun: executes an I-file.
#include "tools/exec/exec.h"

#include <cerrno>
#include <cstdlib>

namespace {
const char help[] =
    "icrun [option...] FILE    executes an I-file from its function main\n"
    "  --max-steps N    ends a run of more than N nodes\n"
    "  --max-memory N   16-bit units of memory, 16777216 if not given\n"
    "  --stats          operations (weighted operators), loads, stores, branches, calls, multiplies, and nodes by operator,\n"
    "                   on standard error; innermost loops, those that close with one branch, and those with tests of\n"
    "                   their own\n"
    "  --profile        the same by function and line: calls, nodes, executions; each innermost loop\n"
    "  --check          asserted conditions and promised trip counts of loops are checked, that loop records are of\n"
    "                   the loops that there are, and that each two accesses that meet have a dependence that\n"
    "                   tells so; inline assembly ends the run\n"
    "  --innermost      with --check: dependences are those of innermost loops alone, as under --use_g2\n"
    "  --globals        a digest of each object's contents at the end\n"
    "  --help           this text\n"
    "The status is main's value modulo 256, or:\n"
    "  64 command line      65 no I-file            66 cannot be executed   67 function or object missing\n"
    "  68 bad address       69 unaligned object     70 division by zero     71 too many steps\n"
    "  72 stack overflow    73 abort() called       74 unreachable place    75 an annotation is wrong\n"
    "  76 a loop does not iterate as promised\n"
    "with a message on standard error that names the function and the line.\n";

int fail(int status, const std::string& text) {
    std::fflush(stdout);
    std::fprintf(stderr, "icrun: %s\n", text.c_str());
    return status;
}

bool number(const char* word, uint64_t& value) {
    char* end = nullptr;
    value = word ? std::strtoull(word, &end, 0) : 0;
    return word && end != word && *end == 0;
}
} // namespace

int main(int argc, char** argv) {
    EXEC_OPTIONS options;
    const char* name = nullptr;
    for (int i = 1; i < argc; i++) {
        const std::string word = argv[i];
        if (word == "--help") {
            std::fputs(help, stdout);
            return 0;
        }
        if (word == "--stats")
            options.stats = true;
        else if (word == "--profile")
            options.profile = true;
        else if (word == "--check")
            options.check = true;
        else if (word == "--innermost")
            options.innermost = true;
        else if (word == "--globals")
            options.globals = true;
        else if (word == "--max-steps" || word == "--max-memory") {
            uint64_t& value = word == "--max-steps" ? options.max_steps : options.max_memory;
            if (!number(argv[++i < argc ? i : argc], value)) return fail(EXEC_USAGE, word + " needs a number");
        } else if (word[0] == '-' || name)
            return fail(EXEC_USAGE, "what is " + word + "?\n" + help);
        else
            name = argv[i];
    }
    if (!name) return fail(EXEC_USAGE, std::string("no file\n") + help);
    if (options.max_memory < 4096 || options.max_memory > (uint64_t{1} << 30))
        return fail(EXEC_USAGE, "--max-memory is from 4096 to 1073741824 units");
    FILE* stream = std::fopen(name, "rb");
    if (!stream) return fail(EXEC_BAD_FILE, std::string(name) + ": " + std::strerror(errno));
    try {
        IC_UNIT unit;
        unit.read(stream, ic_type_package());
        const EXEC_RESULT result = execute(unit, options, stdout, stderr);
        if (result.failed) return fail(result.status, result.error);
        return result.status;
    } catch (const if_error& error) {
        const char* text = error.what();
        while (*text == '\n') text++;
        return fail(EXEC_BAD_FILE, std::string(name) + ": " + text);
    } catch (const tp_failure& error) {
        return fail(EXEC_BAD_FILE, std::string(name) + ": " + error.what());
    }
}
