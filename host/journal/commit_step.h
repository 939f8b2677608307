/// Points on the way of a transaction, for tests that end the process at one of them.
#pragma once

#include <atomic>

namespace host {

enum class CommitStep { BeforeCommit, AfterCommit };

using CommitHook = void (*)(CommitStep step);

/// Called on the writer's thread; null outside tests.
inline std::atomic<CommitHook> commitHook{nullptr};

inline void reached(CommitStep step) {
    if (const CommitHook hook = commitHook.load()) hook(step);
}

}  // namespace host
