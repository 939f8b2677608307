/// Lets the host process hear trace lines, whether or not they are logged.
#pragma once

#include <cstddef>
#include <vector>

#include "platform/ras1.h"

namespace ras1 {

/// One line. Everything belongs to the thread that traces it and is gone after the call.
struct HeardLine {
    const char* unit;
    const char* function;
    unsigned level;    ///< RAS1_DETAIL or RAS1_ERROR
    const char* text;  ///< as it was passed, line feeds at its end included; ends in a 0
    std::size_t length;
};

/// Which lines of a unit are heard.
struct HeardUnit {
    const char* name;  ///< of exactly this unit; a literal
    unsigned levels;   ///< RAS1_DETAIL, RAS1_ERROR or both
};

/// Hears lines on the thread that traces them, so it can tell by thread-local data whose they are.
/// Lines of several threads come at the same time.
class Listener {
public:
    /// May take as long as it likes; the thread goes on when it returns. errno is what it was when
    /// the line was traced, and need not be kept.
    ///
    /// A line that a child traces between vfork and exec comes too, while the parent's thread is
    /// suspended. The child shares the parent's memory and has its thread-local data: there the
    /// listener may only store into memory that was set aside before. No locks, no allocation.
    virtual void hear(const HeardLine& line) noexcept = 0;

protected:
    ~Listener() = default;
};

/// Makes the listener hear these units' lines on all threads, for as long as it exists. What is
/// logged does not change. Units that are not heard cost what they cost without it.
class Listening {
public:
    /// The listener outlives this object. Throws std::logic_error when somebody listens already.
    Listening(Listener& listener, std::vector<HeardUnit> units);
    /// Waits for calls in progress, so it must not run in one.
    ~Listening();
    Listening(const Listening&) = delete;
    Listening& operator=(const Listening&) = delete;
};

}  // namespace ras1
