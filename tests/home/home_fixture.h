/// A prepared home in a scratch directory, and its programs run as a caller runs them.
#pragma once

#include <gmock/gmock.h>
#include <gtest/gtest.h>
#include <signal.h>
#include <sys/stat.h>
#include <unistd.h>

#include <filesystem>
#include <fstream>
#include <iterator>
#include <sstream>
#include <string>
#include <vector>

#include "support/host/program.h"
#include "support/scratch_dir.h"

using Outcome = ProgramResult;

/// Runs a program to its end; the environment's entries, NAME=value, may have empty values.
inline Outcome run(std::vector<std::string> words, const std::string& input = "",
                   const std::vector<std::string>& environment = {}) {
    if (!environment.empty()) {
        words.insert(words.begin(), environment.begin(), environment.end());
        words.insert(words.begin(), "/usr/bin/env");
    }
    return runProgram(words, input);
}

/// Whether the process exists and is more than the remains that its parent has not fetched yet.
inline bool lives(pid_t pid) {
    std::ifstream stat("/proc/" + std::to_string(pid) + "/stat");
    std::string line;
    if (!std::getline(stat, line)) return false;
    const auto end = line.rfind(") ");
    return end != std::string::npos && line[end + 2] != 'Z' && line[end + 2] != 'X';
}

class HomeTest : public ::testing::Test {
protected:
    void TearDown() override {
        // Nothing that a failed test started may outlive it.
        std::error_code unreadable;
        for (const auto& file : std::filesystem::recursive_directory_iterator(home(), unreadable)) {
            if (file.path().extension() != ".pid" || file.is_symlink() || !file.is_regular_file()) {
                continue;
            }
            const pid_t pid = pidIn(file.path());
            std::ifstream environment("/proc/" + std::to_string(pid) + "/environ");
            std::stringstream text;
            text << environment.rdbuf();
            if (pid > 1 && text.str().find("TOVRINHOME=" + home()) != std::string::npos) {
                ::kill(-pid, SIGKILL);
            }
        }
    }

    static std::string source(const std::string& file = "") {
        return std::string(ZAV_SOURCE_DIR "/home") + (file.empty() ? "" : "/" + file);
    }
    virtual std::string home() const { return scratch.path("home"); }
    std::string inHome(const std::string& file) const { return home() + "/" + file; }

    /// Makes the home with the platform code "lx8266" unless the options say otherwise.
    Outcome prepare(const std::vector<std::string>& options = {"--arch", "lx8266"}) {
        std::vector<std::string> words{source("bin/prepare-home"), home()};
        words.insert(words.end(), options.begin(), options.end());
        return run(words);
    }

    std::string read(const std::string& file) const {
        std::ifstream in(inHome(file), std::ios::binary);
        return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
    }
    void write(const std::string& file, const std::string& text, mode_t mode = 0644) const {
        std::filesystem::create_directories(std::filesystem::path(inHome(file)).parent_path());
        std::ofstream(inHome(file), std::ios::binary | std::ios::trunc) << text;
        ::chmod(inHome(file).c_str(), mode);
    }
    bool exists(const std::string& file) const { return std::filesystem::exists(inHome(file)); }

    /// A product whose agent is this script; a start counts at once, a stop insists after a second.
    void addAgent(const std::string& product, const std::string& body,
                  const std::string& defaults = "START_SECONDS=0\nSTOP_SECONDS=1\n") const {
        write("agtqvs6/lx8266/" + product + "/bin/agent", "#!/bin/sh\n" + body, 0755);
        write("agtqvs6/lx8266/" + product + "/agent.cfg", defaults);
    }

    Outcome agent(std::vector<std::string> words) const {
        words.insert(words.begin(), {inHome("bin/TovrinAgent"), "-h", home()});
        return run(words);
    }
    Outcome translate(std::vector<std::string> words, const std::string& input = "") const {
        words.insert(words.begin(), inHome("agtqvs6/lx8266/bin/zav_xa"));
        return run(words, input);
    }

    static pid_t pidIn(const std::filesystem::path& file) {
        pid_t pid = 0;
        std::ifstream(file) >> pid;
        return pid;
    }
    pid_t pidOf(const std::string& key) const { return pidIn(inHome("run/" + key + ".pid")); }

    ScratchDir scratch;
};

/// The usual case: the home is there before the test begins.
class PreparedHomeTest : public HomeTest {
protected:
    void SetUp() override { ASSERT_EQ(prepare().status, 0); }
};
