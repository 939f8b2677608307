/// What the centre knows about hosts and orders.
#pragma once

#include <optional>
#include <string>

#include "fleet/bus/messages/outcome.h"

namespace fleet {

struct HostRecord {
    std::string host;            ///< its bus key
    std::string signing;         ///< the public key with which its link signs
    std::string name;            ///< for people
    Number last = 0;             ///< the highest number given
    Number told = 0;             ///< the highest `taken` that its link has told
    std::string machine;         ///< the machine's identity at enrolment; "" before the first hello
    std::string journal;         ///< the link's, or the first one that it saw; "" before that
    std::string session;         ///< of the link's latest start
    std::string earlierSession;  ///< of the start before it
    std::string stopped;         ///< why its link must not go on; "" if it may
    std::string unpublished;     ///< why nothing is published for it; "" if nothing is wrong
    Moment heard{};              ///< when the latest hello came
    Moment toldTime{};           ///< the host's time in that
};

/// An order, with its number.
struct OrderRecord {
    std::string host;
    Number number = 0;  ///< 0 if only the host's journal knows of it
    std::string order;  ///< its identifier
    std::string bytes;  ///< as published: the number, and the order as its operator has signed it
    bool isPublished = false;
    std::optional<Outcome> outcome;
};

/// An order without an outcome. Its bytes stay where they are: a host may have many, and long ones.
struct OpenOrder {
    Number number = 0;  ///< as in OrderRecord
    std::string order;
    bool isPublished = false;
};

}  // namespace fleet
