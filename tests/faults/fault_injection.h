/// Makes the calls that the library makes of the system fail, one at a time.
///
/// A program that links this has its own definitions of these calls, which come before the C
/// library's. Only calls from the program's own text count, which is where the library is; what the
/// platform, the C++ library and the C library call themselves passes through. Memory is different:
/// operator new is counted whoever calls it.
#pragma once

#include <cstddef>

namespace faults {

enum class Call {
    kAccess,
    kCalloc,
    kChmod,
    kClose,
    kDup2,
    kExecve,
    kFclose,
    kFchmod,
    kFcntl,
    kFdopen,
    kFread,
    kFstat,
    kFwrite,
    kKill,
    kLink,
    kLinkat,
    kLseek,
    kLstat,
    kMalloc,
    kMkdir,
    kMkdirat,
    kNew,
    kOpen,
    kOpenat,
    kOpenat2,
    kPidfdOpen,
    kPipe2,
    kPoll,
    kRead,
    kUname,
    kUnlink,
    kUnlinkat,
    kVfork,
    kWaitpid,
    kWrite,
    kWritev,
    kCount
};

/// The name of the call as the C library has it.
const char* nameOf(Call call);

#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr bool kMemoryIsOurs = false;  ///< the sanitizer's: kCalloc, kMalloc and kNew do not fail
#else
constexpr bool kMemoryIsOurs = true;
#endif

/// While it exists, the `nth` call of one kind (from 1), and all later ones when asked, fails with
/// `error`, in this process and in a child before its exec. A call that fails does nothing, except
/// that close and fclose do close. One at a time.
class Fault {
public:
    enum class Lasts { kOnce, kOnwards };

    Fault(Call call, int nth, int error, Lasts lasts = Lasts::kOnce);
    ~Fault();
    Fault(const Fault&) = delete;
    Fault& operator=(const Fault&) = delete;

    /// Whether a call has failed.
    bool happened() const;
};

/// While it exists, every other call that a signal handler may interrupt fails with EINTR: open,
/// openat, openat2, read, write, writev, poll and waitpid.
class Interruptions {
public:
    Interruptions();
    ~Interruptions();
    Interruptions(const Interruptions&) = delete;
    Interruptions& operator=(const Interruptions&) = delete;

    /// How many calls have failed so far.
    int count() const;
};

/// While it exists, the date (CLOCK_REALTIME, time, gettimeofday) is moved by another `step`
/// seconds at every look, to and fro. The monotonic clock stays.
class JumpingDate {
public:
    explicit JumpingDate(long step);
    ~JumpingDate();
    JumpingDate(const JumpingDate&) = delete;
    JumpingDate& operator=(const JumpingDate&) = delete;

    /// How many looks there have been.
    int looks() const;
};

}  // namespace faults
