/// What the host knows about the tables of the management plug-in beyond what they say of
/// themselves. It stands here and nowhere else; a test compares it with the plug-in.
#pragma once

#include <array>
#include <string_view>

namespace host::plugin {

/// A query on this table is a request: sampling it carries out a command or queues it. The row that
/// answers tells whether the command was accepted.
inline constexpr std::string_view kRequestTable = "KAGREQT";

/// Each queued command that ends, however it ends, publishes one row of this table.
inline constexpr std::string_view kOutcomeTable = "KAGDYST";

/// What is installed, as the last command of the query, the inventory program, tells it. No rows if
/// that fails.
inline constexpr std::string_view kInventoryTable = "KINAGT";

/// In both tables: what the requester calls the command. An outcome carries the one of its request.
inline constexpr std::string_view kTransidColumn = "TRANSID";
/// In the request table: the command.
inline constexpr std::string_view kCommandColumn = "COMMAND";
/// In the request table: kAccepted, or why the command was refused.
inline constexpr std::string_view kRetvalColumn = "RETVAL";
inline constexpr int kAccepted = 0;

/// In the request table: parameters of the command. SETCONFIG's context and GETCONFIG's answer are
/// an agent's configuration, passwords among it.
inline constexpr std::string_view kProductColumn = "PRODUCT";
inline constexpr std::string_view kContextColumn = "CONTEXT";
inline constexpr std::string_view kOptionalColumn = "OPTIONAL";
inline constexpr std::string_view kGetConfiguration = "GETCONFIG";
/// What the last command of a GETCONFIG writes before this is no part of the configuration.
inline constexpr std::string_view kConfigurationBegin = "INSTANCE=";
inline constexpr std::string_view kSetConfiguration = "SETCONFIG";

constexpr bool holdsConfiguration(std::string_view command) {
    return command == kSetConfiguration || command == kGetConfiguration;
}

/// An INSTALL with this OPTIONAL has two outcomes: one with kAccepted when it begins, since it may
/// end the process, and one at its end. One that cannot begin has only that outcome.
inline constexpr std::string_view kInstall = "INSTALL";
inline constexpr std::string_view kWithRestart = "REQUIRES_RESTART";

/// These commands have been carried out when their request is answered. All others are queued.
inline constexpr std::array<std::string_view, 2> kCommandsAtOnce = {kGetConfiguration,
                                                                    "COMPLETE_INSTALL"};

constexpr bool runsAtOnce(std::string_view command) {
    for (const std::string_view atOnce : kCommandsAtOnce) {
        if (command == atOnce) return true;
    }
    return false;
}

}  // namespace host::plugin
