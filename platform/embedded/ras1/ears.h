/// Who hears which lines, besides the log.
#pragma once

#include <atomic>
#include <memory>
#include <mutex>
#include <vector>

#include "embedded/ras1_listener.h"

namespace ras1 {

/// One process has one, which is never destroyed because threads trace until the process ends.
/// Telling and looking up take no lock and allocate nothing.
class Ears {
public:
    static Ears& ofProcess();

    /// False when somebody listens already.
    bool open(Listener& listener, std::vector<HeardUnit> units);
    /// Returns when no call is in progress any more.
    void close();

    /// The levels at which the unit is heard; 0 when it is not.
    unsigned levelsOf(const char* unit) const;
    void tell(const HeardLine& line);

private:
    struct Ear {
        Listener& listener;
        const std::vector<HeardUnit> units;
    };

    std::mutex opening_;
    /// All there ever were, because another thread may be looking at an old one. Guarded by
    /// opening_.
    std::vector<std::unique_ptr<const Ear>> ears_;
    std::atomic<const Ear*> open_{nullptr};
    std::atomic<unsigned> calls_{0};  ///< in progress
};

}  // namespace ras1
