/// Hellos, replies and outcomes as they cross the bus.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/messages/hello.h"
#include "fleet/bus/messages/outcome.h"

namespace fleet {

// What is signed names the host: a hello that was recorded elsewhere counts for nobody else. Each
// function that reads throws MessageError for what is no such message, or not this signer's.

std::string signHello(const std::string& host, const Hello& hello, const KeyPair& key);
Hello readHello(std::string_view bytes, const std::string& host, std::string_view key);

std::string signReply(const std::string& host, const Reply& reply, const KeyPair& centre);
/// `centres` are the centre's keys.
Reply readReply(std::string_view bytes, const std::string& host,
                const std::vector<std::string>& centres);

std::string signOutcome(const Outcome& outcome, const KeyPair& key);
Outcome readOutcome(std::string_view bytes, const std::string& host, std::string_view key);

}  // namespace fleet
