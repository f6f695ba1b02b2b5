#include "run.h"

#include "OPT5/driver/driver.h"

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <sstream>
#include <sys/wait.h>
#include <unistd.h>

namespace {

std::string number(uint64_t n) {
    std::string bytes;
    do {
        bytes += static_cast<char>((n & 0x7F) | (n > 0x7F ? 0x80 : 0));
        n >>= 7;
    } while (n);
    return bytes;
}

std::string word32(uint32_t n) {
    std::string bytes;
    for (int i = 0; i < 4; ++i) bytes += static_cast<char>(n >> (8 * i) & 0xFF);
    return bytes;
}

std::string text(const std::string& s) { return s + '\0'; }
std::string record(int kind, const std::string& payload) {
    return static_cast<char>(kind) + number(payload.size()) + payload;
}
std::string bytes(std::initializer_list<int> list) { return std::string(list.begin(), list.end()); }

constexpr int POSITION[] = {1, 1, 1};
const std::string at = bytes({POSITION[0], POSITION[1], POSITION[2]});
const std::string end(1, '\xFF');

std::string body(int global) {
    return record(1, at + number(global)) + record(5, at) + record(6, at) +
           record(46, bytes({1, 2, 3})) + // line 2, column 3
           record(101, bytes({36, 1})) + record(101, bytes({2, 3, 0}) + number(global)) +
           record(101, bytes({4, 1, 7})) + record(2, at);
}

// 1: int, 2: void, 3: function returning int.
std::string types() {
    return record(116, bytes({1, 6, 0, 16, 16, 0, 0})) + record(116, bytes({2, '1'})) +
           record(116, bytes({3, 20, 1, 0, 0, 0, 0})) + record(116, bytes({3, 0xFE, 0})) +
           record(116, bytes({3, 0xFF, 0}));
}

} // namespace

std::string unit(const OPTION_SETS& sets, int count) {
    const std::string source = text("unit.c");
    const uint32_t start = 47;
    std::string options, rest, symbols;
    for (const auto& [id, words] : sets) {
        std::string payload = number(id) + number(words.size());
        for (const std::string& word : words) payload += text(word);
        options += record(111, payload);
    }
    for (int i = 0; i < count; ++i) {
        symbols += record(35, text(i == 0 ? "_main" : "_f" + std::to_string(i)) + bytes({32, 0, 2, 0, 0, 3, 3, 32, 0}) +
                                  number(start + rest.size()) + bytes({0}) + at + bytes({0}));
        rest += body(i);
    }
    rest += end;
    uint32_t offsets[5] = {};
    const auto section = [&](int which, const std::string& content) {
        offsets[which] = start + static_cast<uint32_t>(rest.size());
        rest += content + end;
    };
    if (!sets.empty()) section(0, options);
    section(2, count ? types() : "");
    section(3, record(126, source));
    section(4, symbols);
    std::string header = text("!<icode>\n") + bytes({0xB9, 0xFF, 0x58, 0x02});
    for (uint32_t offset : offsets) header += word32(offset);
    return record(8, header + source + word32(0)) + rest;
}

WORKPLACE::WORKPLACE() {
    char name[] = "/tmp/zoptXXXXXX";
    dir = mkdtemp(name);
}
WORKPLACE::~WORKPLACE() {
    std::error_code ignored;
    std::filesystem::remove_all(dir, ignored);
}

void WORKPLACE::put(const std::string& name, const std::string& content) const {
    std::ofstream(dir + "/" + name, std::ios::binary) << content;
}

std::string WORKPLACE::get(const std::string& name) const {
    std::stringstream content;
    content << std::ifstream(dir + "/" + name, std::ios::binary).rdbuf();
    return content.str();
}

bool WORKPLACE::has(const std::string& name) const { return access((dir + "/" + name).c_str(), F_OK) == 0; }

RESULT WORKPLACE::run(const std::vector<std::string>& words, const std::map<std::string, std::string>& environment,
                      void (*before)()) const {
    std::fflush(nullptr);
    const pid_t child = fork();
    if (child == 0) {
        unsetenv("FORCED_OPT_PASSES");
        for (const auto& [name, value] : environment) setenv(name.c_str(), value.c_str(), 1);
        if (chdir(dir.c_str()) != 0 || !std::freopen("stdout.txt", "w", stdout) ||
            !std::freopen("stderr.txt", "w", stderr))
            std::_Exit(99);
        std::setvbuf(stderr, nullptr, _IONBF, 0);
        std::vector<char*> argv;
        std::string program = "zopt";
        argv.push_back(program.data());
        std::vector<std::string> copies = words;
        for (std::string& word : copies) argv.push_back(word.data());
        argv.push_back(nullptr);
        if (before) before();
        std::exit(zopt_main(static_cast<int>(argv.size()) - 1, argv.data()));
    }
    RESULT result;
    int status = 0;
    waitpid(child, &status, 0);
    result.status = WIFEXITED(status) ? WEXITSTATUS(status) : 1000 + WTERMSIG(status);
    result.out = get("stdout.txt");
    result.err = get("stderr.txt");
    for (const char* name : {"/stdout.txt", "/stderr.txt"}) unlink((dir + name).c_str());
    return result;
}
