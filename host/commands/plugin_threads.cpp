#include "host/commands/plugin_threads.h"

namespace host {

PluginThreads& PluginThreads::ofProcess() {
    static PluginThreads& instance = *new PluginThreads;
    return instance;
}

Recorder* PluginThreads::add() {
    const auto recorder =
        std::make_shared<Recorder>(0, [this](const OutputPiece& piece) { tell(piece); });
    const embedded::MutexLock lock(lock_);
    Recorder* const added = recorders_.emplace_back(recorder).get();
    if (ending_) added->endCommands();
    return added;
}

std::optional<std::chrono::steady_clock::time_point> PluginThreads::deadline() const {
    std::optional<std::chrono::steady_clock::time_point> earliest;
    for (const std::shared_ptr<Recorder>& recorder : all()) {
        const auto deadline = recorder->deadline();
        if (deadline && (!earliest || *deadline < *earliest)) earliest = deadline;
    }
    return earliest;
}

void PluginThreads::hearOutput(const std::shared_ptr<const Recorder::OutputSink>& sink) {
    const embedded::MutexLock lock(lock_);
    sink_ = sink;
}

void PluginThreads::tell(const OutputPiece& piece) const {
    std::shared_ptr<const Recorder::OutputSink> sink;
    {
        const embedded::MutexLock lock(lock_);
        sink = sink_.lock();
    }
    if (sink) (*sink)(piece);
}

std::vector<std::shared_ptr<Recorder>> PluginThreads::all() const {
    const embedded::MutexLock lock(lock_);
    return recorders_;
}

void PluginThreads::endCommands() {
    const embedded::MutexLock lock(lock_);
    ending_ = true;
    for (const auto& recorder : recorders_)
        recorder->endCommands();
}

bool PluginThreads::letCommandsRun() {
    const embedded::MutexLock lock(lock_);
    ending_ = false;
    bool ended = false;
    for (const auto& recorder : recorders_)
        ended = recorder->letCommandsRun() || ended;
    return ended;
}

}  // namespace host
