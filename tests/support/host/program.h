/// Runs real programs from tests.
#pragma once

#include <sys/types.h>

#include <chrono>
#include <string>
#include <utility>
#include <vector>

struct ProgramResult {
    int status = -1;  ///< exit status, or 128 + signal
    std::string out;
    std::string err;
};

/// Environment variables to set for a program on top of the test's own; an empty value unsets.
using Environment = std::vector<std::pair<std::string, std::string>>;

/// A running program; killed if it still runs when the object is destroyed.
class Program {
public:
    /// Starts argv[0] with `input` as its standard input and its outputs going to files.
    Program(const std::vector<std::string>& argv, const std::string& input = "",
            const Environment& environment = {});
    ~Program();
    Program(const Program&) = delete;
    Program& operator=(const Program&) = delete;

    pid_t pid() const { return pid_; }
    bool running();
    void signal(int number) const;
    /// Waits until it ends; kills it and reports 137 when it has not ended by then.
    ProgramResult wait(std::chrono::milliseconds limit = std::chrono::seconds(60));
    /// What it has written so far.
    std::string out() const;
    std::string err() const;
    /// Waits until standard output holds `text`; false when it did not in time or the program
    /// ended.
    bool awaitOutput(const std::string& text, std::chrono::milliseconds limit);

private:
    bool reap(bool block);

    pid_t pid_ = -1;
    int status_ = -1;
    bool ended_ = false;
    int outFile_ = -1;
    int errFile_ = -1;
};

/// Runs a program to its end.
ProgramResult runProgram(const std::vector<std::string>& argv, const std::string& input = "",
                         const Environment& environment = {},
                         std::chrono::milliseconds limit = std::chrono::seconds(60));

/// Polls until the condition holds; false when it did not within the limit.
template <typename Condition>
bool eventually(Condition condition, std::chrono::milliseconds limit = std::chrono::seconds(60));

// ---------------------------------------------------------------------------------------------

void sleepBriefly();

template <typename Condition>
bool eventually(Condition condition, std::chrono::milliseconds limit) {
    const auto end = std::chrono::steady_clock::now() + limit;
    while (!condition()) {
        if (std::chrono::steady_clock::now() >= end) return false;
        sleepBriefly();
    }
    return true;
}
