#include "support/host/program.h"

#include <fcntl.h>
#include <signal.h>
#include <spawn.h>
#include <sys/mman.h>
#include <sys/wait.h>
#include <unistd.h>

#include <cerrno>
#include <cstring>
#include <stdexcept>
#include <thread>

extern char** environ;

namespace {

constexpr std::chrono::milliseconds kPause(5);

/// A file without a name.
int scratchFile(const std::string& content = "") {
    const int file = ::memfd_create("program", MFD_CLOEXEC);
    if (file == -1) throw std::runtime_error("no scratch file");
    if (::write(file, content.data(), content.size()) != static_cast<ssize_t>(content.size())) {
        throw std::runtime_error("cannot write the program's input");
    }
    ::lseek(file, 0, SEEK_SET);
    return file;
}

std::string contentOf(int file) {
    std::string content;
    char piece[16384];
    for (;;) {
        const ssize_t length =
            ::pread(file, piece, sizeof piece, static_cast<off_t>(content.size()));
        if (length <= 0) return content;
        content.append(piece, static_cast<std::size_t>(length));
    }
}

std::vector<std::string> mergedEnvironment(const Environment& changes) {
    std::vector<std::string> merged;
    for (char** entry = environ; *entry != nullptr; ++entry) {
        bool replaced = false;
        for (const auto& change : changes) {
            replaced = replaced || std::strncmp(*entry, (change.first + "=").c_str(),
                                                change.first.size() + 1) == 0;
        }
        if (!replaced) merged.emplace_back(*entry);
    }
    for (const auto& [name, value] : changes) {
        if (!value.empty()) merged.push_back(name + "=" + value);
    }
    return merged;
}

std::vector<char*> pointers(std::vector<std::string>& texts) {
    std::vector<char*> result;
    for (std::string& text : texts)
        result.push_back(text.data());
    result.push_back(nullptr);
    return result;
}

}  // namespace

Program::Program(const std::vector<std::string>& argv, const std::string& input,
                 const Environment& environment)
    : outFile_(scratchFile()), errFile_(scratchFile()) {
    const int inFile = scratchFile(input);
    posix_spawn_file_actions_t actions;
    ::posix_spawn_file_actions_init(&actions);
    ::posix_spawn_file_actions_adddup2(&actions, inFile, 0);
    ::posix_spawn_file_actions_adddup2(&actions, outFile_, 1);
    ::posix_spawn_file_actions_adddup2(&actions, errFile_, 2);
    std::vector<std::string> arguments = argv;
    std::vector<std::string> variables = mergedEnvironment(environment);
    const int error = ::posix_spawn(&pid_, argv[0].c_str(), &actions, nullptr,
                                    pointers(arguments).data(), pointers(variables).data());
    ::posix_spawn_file_actions_destroy(&actions);
    ::close(inFile);
    if (error != 0) throw std::runtime_error("cannot start " + argv[0]);
}

Program::~Program() {
    if (!ended_) {
        ::kill(pid_, SIGKILL);
        reap(true);
    }
    ::close(outFile_);
    ::close(errFile_);
}

bool Program::reap(bool block) {
    if (ended_) return true;
    int status = 0;
    pid_t result = 0;
    do {
        result = ::waitpid(pid_, &status, block ? 0 : WNOHANG);
    } while (result == -1 && errno == EINTR);
    if (result != pid_) return false;
    ended_ = true;
    status_ = WIFSIGNALED(status) ? 128 + WTERMSIG(status) : WEXITSTATUS(status);
    return true;
}

bool Program::running() {
    return !reap(false);
}

void Program::signal(int number) const {
    if (!ended_) ::kill(pid_, number);
}

ProgramResult Program::wait(std::chrono::milliseconds limit) {
    if (!eventually([this] { return reap(false); }, limit)) {
        ::kill(pid_, SIGKILL);
        reap(true);
    }
    return {status_, out(), err()};
}

std::string Program::out() const {
    return contentOf(outFile_);
}

std::string Program::err() const {
    return contentOf(errFile_);
}

bool Program::awaitOutput(const std::string& text, std::chrono::milliseconds limit) {
    eventually([&] { return out().find(text) != std::string::npos || reap(false); }, limit);
    return out().find(text) != std::string::npos;
}

ProgramResult runProgram(const std::vector<std::string>& argv, const std::string& input,
                         const Environment& environment, std::chrono::milliseconds limit) {
    return Program(argv, input, environment).wait(limit);
}

void sleepBriefly() {
    std::this_thread::sleep_for(kPause);
}
