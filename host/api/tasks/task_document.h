/// Tasks and commands as JSON.
#pragma once

#include <nlohmann/json_fwd.hpp>
#include <string>
#include <vector>

#include "host/api/schema.h"
#include "host/api/services.h"
#include "host/outcomes/task.h"
#include "http/peer.h"
#include "http/reply.h"

namespace host {

/// Whether what commands wrote may be told, also by rows that hold it.
enum class Outputs { Hidden, Shown };

/// Shown to those who may act only: it may hold anything.
Outputs outputsFor(const http::Peer& peer);

/// {"command", "pid", "started", "ended", "exit" | "signal" | "error", "timed_out"?, "stdout",
/// "stderr"}. Members that are not known are left out, and so are outputs that are hidden.
nlohmann::ordered_json commandObject(const Command& command, const CodePage& codePage,
                                     Outputs outputs);

/// The members of that object, for the interface's description.
std::vector<shape::Property> commandProperties(Components& components);

/// Identifier, TRANSID, what was asked for, state, times and asker.
nlohmann::ordered_json taskSummary(const Task& task, const CodePage& codePage);

/// The summary with the run of the host and the start of the machine in which it was handed over,
/// "force", "interruptions", "reply", "events" and "details", as text. Where outputs are hidden,
/// its rows are those of rowForReaders().
std::string taskDocument(const Task& task, const Services& services, Outputs outputs);

/// Answers with that document.
http::Reply taskReply(unsigned status, const Task& task, const Services& services, Outputs outputs);

}  // namespace host
