#include "host/commands/command_ending.h"

#include <csignal>
#include <utility>
#include <vector>

#include "host/commands/plugin_threads.h"
#include "host/process/children/descendants.h"
#include "host/process/children/orphans.h"

namespace host {
namespace {

using Clock = std::chrono::steady_clock;

/// Between two looks at the processes.
constexpr std::chrono::milliseconds kEndingLook{20};
/// What does not even end by SIGKILL hangs in the kernel, or starts others faster than they can be
/// killed.
constexpr std::chrono::seconds kKillPatience{5};

/// Those that were there before the task's first command.
std::vector<pid_t> orphansBeforeTask() {
    for (const auto& recorder : PluginThreads::ofProcess().all()) {
        if (auto before = recorder->orphansBeforeFirst()) return std::move(*before);
    }
    return orphans();
}

}  // namespace

CommandEnding::CommandEnding(std::chrono::milliseconds patience) : until_(Clock::now() + patience) {
    PluginThreads::ofProcess().endCommands();
    try {
        thread_ = std::thread([this] { work(); });
    } catch (...) {
        PluginThreads::ofProcess().letCommandsRun();
        throw;
    }
}

CommandEnding::~CommandEnding() {
    finish();
}

bool CommandEnding::finish() {
    {
        const std::lock_guard<std::mutex> lock(lock_);
        finishing_ = true;
    }
    changed_.notify_all();
    if (thread_.joinable()) {
        thread_.join();
        if (PluginThreads::ofProcess().letCommandsRun()) reached_ = true;
    }
    return reached_;
}

/// False when nothing of it lives.
bool CommandEnding::look(int signal, Descendants& descendants) {
    bool found = false;
    for (const auto& recorder : PluginThreads::ofProcess().all()) {
        // The lock of the recorder keeps the plug-in from reaping the command meanwhile.
        recorder->withCommandInHand([&](pid_t command) {
            descendants.look(command, true);
            if (descendants.send(signal) > 0) reached_ = true;
            found = found || descendants.living() > 0;
        });
    }
    return found;
}

void CommandEnding::work() {
    Descendants descendants(orphansBeforeTask());
    std::unique_lock<std::mutex> lock(lock_);
    for (;;) {
        lock.unlock();
        const auto now = Clock::now();
        const bool lives = look(now < until_ ? SIGTERM : SIGKILL, descendants);
        lock.lock();
        if (finishing_ && (!lives || now > until_ + kKillPatience)) return;
        changed_.wait_for(lock, kEndingLook);
    }
}

}  // namespace host
