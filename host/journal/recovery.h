/// What a new run of the host makes of what the last one left.
#pragma once

#include <cstdint>
#include <string>

#include "host/journal/database.h"

namespace host {

struct Recovered {
    std::int64_t run = 0;        ///< the number of the new run
    bool clean = true;           ///< the last run ended in good order
    std::string setAside;        ///< the name that a damaged journal was given; empty: it was sound
    std::string fault;           ///< what was wrong with it
    std::string formerIdentity;  ///< of a journal that was set aside once; empty: none, or unknown
    std::int64_t waiting = 0;    ///< tasks that will run
    std::string interrupted;     ///< identifier of the task that was cut off; empty: there is none
    bool runsAgain = false;      ///< it will run again
    std::string begun;          ///< identifier of the install that may go on by itself; empty: none
    bool bootedAnew = false;    ///< the machine was started anew in its midst
    std::int64_t salvaged = 0;  ///< unfinished tasks that were read from a damaged journal
};

/// A task that was in hand at so many unclean ends does not run again: it may be what ends the
/// host.
inline constexpr int kMostInterruptions = 3;

/// Names the present start of the machine.
std::string bootName();

/// Whatever is unfinished waits for the host to hand it over: the plug-in's queue is gone, or about
/// to go, and nothing of it has begun. Only an install that restarts the host goes on by itself.
void takeBackUnfinished(Database& database);

/// Settles what is unfinished, and begins a new run, in one transaction. Of what had been handed to
/// the plug-in only the oldest task can have begun: it is interrupted. What waited behind it waits
/// again, in the old order. An install that had begun and may restart the host stays in hand.
/// `boot` names the present start of the machine. Throws DatabaseError.
void settleUnfinished(Database& database, bool rerunInterrupted, const std::string& boot,
                      Recovered& recovered);

/// Takes over from a damaged journal, as far as the damage lets it: its identity as the former one,
/// the key of its hashes, and its unfinished tasks, which are entered as interrupted. Returns how
/// many those are. `notedIdentity` is taken where the journal does not tell its own.
std::int64_t salvage(const std::string& damagedFile, const std::string& notedIdentity,
                     Database& database);

}  // namespace host
