#include "util/process/exec_plan.h"

#include <unistd.h>

#include <cerrno>
#include <cstring>

namespace ZAV {
namespace {

constexpr const char* kShell = "/bin/sh";
constexpr const char* kSystemPath = "/bin:/usr/bin";
constexpr std::size_t kScriptPlace = 1;

/// Whether the search goes on with the next directory after this error of exec.
bool goesOn(int error) {
    switch (error) {
        case EACCES:
        case ENOENT:
        case ENOTDIR:
        case ESTALE:
        case ENODEV:
        case ETIMEDOUT:
            return true;
        default:
            return false;
    }
}

}  // namespace

ExecPlan::ExecPlan(char* const* arguments, const char* searchPath, char* const* environment)
    : arguments_(arguments), environment_(environment) {
    addCandidates(arguments[0], searchPath != nullptr ? searchPath : kSystemPath);
    shellArguments_.push_back(const_cast<char*>(kShell));  // execve changes none of the texts
    shellArguments_.push_back(nullptr);
    for (char* const* at = arguments + 1; *at != nullptr; ++at)
        shellArguments_.push_back(*at);
    shellArguments_.push_back(nullptr);
}

void ExecPlan::addCandidates(const std::string& name, const char* searchPath) {
    if (name.find('/') != std::string::npos) {
        candidates_.push_back(name);
        return;
    }
    for (const char* at = searchPath;; ++at) {
        const std::size_t length = std::strcspn(at, ":");
        const std::string directory(at, length);
        // An empty entry of the search path is the working directory.
        candidates_.push_back(directory.empty() ? name : directory + "/" + name);
        at += length;
        if (*at == '\0') return;
    }
}

void ExecPlan::execute() {
    for (const std::string& file : candidates_) {
        ::execve(file.c_str(), arguments_, environment_);
        if (errno == ENOEXEC) {
            shellArguments_[kScriptPlace] = const_cast<char*>(file.c_str());
            ::execve(kShell, shellArguments_.data(), environment_);
        }
        if (!goesOn(errno)) return;
    }
}

}  // namespace ZAV
