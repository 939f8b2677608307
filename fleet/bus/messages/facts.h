/// What a host tells about itself: "$KV.HOSTS.HOST" on the bus.
#pragma once

#include <cstddef>
#include <optional>
#include <string>
#include <string_view>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/messages/selector.h"
#include "fleet/bus/messages/values.h"

namespace fleet {

/// What was installed and what ran at one moment.
struct Inventory {
    Moment time{};         ///< when the host was asked, by the link's clock
    std::string document;  ///< JSON: "products", "instances", "warnings", and what was "leftOut"
};

struct Facts {
    std::string host;                    ///< its bus key
    Moment time{};                       ///< when they were told; the newest ones count
    std::string name;                    ///< for people, from the host's own configuration
    Labels labels;                       ///< from there, too
    std::string link;                    ///< the link's version
    std::string version;                 ///< the host's; "" before one has answered
    std::string journal;                 ///< the identity of its journal; "" while no host answers
    std::string blocked;                 ///< why the next order waits; "" if nothing is in the way
    std::optional<Inventory> inventory;  ///< none before the host has answered
};

/// Whether two of them say the same, whenever they were told.
bool saySame(const Facts& a, const Facts& b);

/// The bus takes 64 KiB a message, its headers included.
constexpr std::size_t kMostFactsBytes = std::size_t{63} * 1024;

/// Signed by the link's key. What is longer than kMostFactsBytes no centre takes.
std::string signFacts(const Facts& facts, const KeyPair& key);
/// Facts about that host, which its link has signed. Throws MessageError for all else.
Facts readFacts(std::string_view bytes, const std::string& host, std::string_view key);

}  // namespace fleet
