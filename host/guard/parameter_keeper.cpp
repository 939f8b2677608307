#include "host/guard/parameter_keeper.h"

#include <system_error>

#include "host/guard/refusal.h"
#include "host/tables/plugin_facts.h"

namespace host {

ParameterKeeper::ParameterKeeper(const std::string& home, OutcomeFeed& feed, const TaskList& tasks)
    : copy_(home), tasks_(tasks) {
    outcomes_ = feed.subscribe({}, [this](const oxa::Rows&) {
        onOutcome();
        return static_cast<int>(OXA_OK);
    });
}

std::unique_ptr<ParameterKeeper::Hold> ParameterKeeper::hold(const CommandRequest& request) {
    if (!request.configuresUniversalAgent()) return nullptr;
    const embedded::MutexLock lock(lock_);
    // While there is one, a task may be rewriting the file.
    if (!saved_) {
        try {
            copy_.save();
        } catch (const std::system_error& error) {
            throw Refusal("start-up-parameters", error.what(),
                          "without a copy an interruption could destroy " + copy_.file());
        }
        saved_ = true;
    }
    ++held_;
    return std::make_unique<Hold>(*this);
}

void ParameterKeeper::letGo() {
    const embedded::MutexLock lock(lock_);
    --held_;
    if (saved_ && !isNeeded()) drop();
}

/// The executor has ended one task and not begun another, so the file is whole.
void ParameterKeeper::onOutcome() {
    const embedded::MutexLock lock(lock_);
    if (!saved_) return;
    if (!isNeeded()) return drop();
    try {
        copy_.save();
    } catch (const std::system_error&) {
        // The older copy is still better than none.
    }
}

bool ParameterKeeper::isNeeded() const {
    return held_ > 0 || tasks_.mayChange(std::string(plugin::kUniversalAgent));
}

void ParameterKeeper::drop() {
    try {
        copy_.drop();
        saved_ = false;
    } catch (const std::system_error&) {
        // It stays until the next outcome.
    }
}

}  // namespace host
