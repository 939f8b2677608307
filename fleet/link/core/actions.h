/// What a link's decisions ask its program to do.
#pragma once

#include <optional>
#include <string>
#include <variant>
#include <vector>

#include "fleet/bus/messages/hello.h"
#include "fleet/bus/messages/outcome.h"
#include "fleet/link/core/directive.h"
#include "fleet/link/core/kept.h"

namespace fleet {

/// Read the order with this number from the bus. Answer: Link::read().
struct ReadOrder {
    Number number;
};

/// Fetch the order's files and put them into the depot. Answer: Link::prepared().
struct PrepareFiles {
    Directive directive;
};

/// Give the order to the host, for this journal only. Answer: Link::recorded().
struct HandOver {
    Directive directive;
    std::string journal;
};

/// Have the host record an order that never runs, for this journal only. Answer: Link::recorded().
struct EnterEnd {
    Directive directive;
    EndState state;
    std::string reason;
    std::string journal;
};

/// Cancel the host's task of an order. Answer: Link::cancelled().
struct CancelTask {
    std::string order;  ///< the task's
    Number by;          ///< the number of the order that wants it
};

/// Look an order up in the host's journal. Answer: Link::found().
struct LookUp {
    std::string order;
};

/// Publish an outcome. Nothing waits for an answer: what is lost is asked for by the next reply.
struct Report {
    Outcome outcome;
};

/// Keep this on disk, durably, before anything that comes after it is done.
struct Keep {
    Kept kept;
};

/// Send a hello. Answer: Link::replied(), or nothing. With `listWanted` its program adds which
/// orders the journal has.
struct SayHello {
    Hello hello;
    bool listWanted = false;
};

/// End the link: it must not run on this machine.
struct StopLink {
    std::string reason;
};

using Action = std::variant<ReadOrder, PrepareFiles, HandOver, EnterEnd, CancelTask, LookUp, Report,
                            Keep, SayHello, StopLink>;
/// In the order in which they are to be done.
using Actions = std::vector<Action>;

}  // namespace fleet
