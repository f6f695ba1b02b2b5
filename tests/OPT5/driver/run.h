// Runs the whole program in a child process, in a directory of its own, over I-files made here.
#pragma once

#include <cstdint>
#include <map>
#include <string>
#include <utility>
#include <vector>

using OPTION_SETS = std::vector<std::pair<unsigned, std::vector<std::string>>>;

// The bytes of a unit: `int main() { return 7; }` and as many more functions `f1`, `f2`, ... of the same body as it
// takes to come to `count`, with these option sets.
std::string unit(const OPTION_SETS& sets = {}, int count = 1);

struct RESULT {
    int status = -1; // 1000 and the signal if one ended it
    std::string out, err;
};

class WORKPLACE {
public:
    WORKPLACE();
    ~WORKPLACE();
    WORKPLACE(const WORKPLACE&) = delete;
    WORKPLACE& operator=(const WORKPLACE&) = delete;

    void put(const std::string& name, const std::string& bytes) const;
    std::string get(const std::string& name) const; // empty if there is none
    bool has(const std::string& name) const;
    // `words` behind the program's name "zopt"; a word of the environment is set for the run.
    RESULT run(const std::vector<std::string>& words, const std::map<std::string, std::string>& environment = {},
               void (*before)() = nullptr) const;

    std::string dir;
};
