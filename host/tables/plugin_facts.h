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

/// Runs what tells the architecture in the inventory's rows.
inline constexpr std::string_view kProbeShell = "/bin/ksh";

/// In both tables: what the requester calls the command. An outcome carries the one of its request.
inline constexpr std::string_view kTransidColumn = "TRANSID";
/// In the request table: the command.
inline constexpr std::string_view kCommandColumn = "COMMAND";
/// In the request table: kAccepted, or why the command was refused.
inline constexpr std::string_view kRetvalColumn = "RETVAL";
inline constexpr int kAccepted = 0;

/// In the request table: the parameters of the commands. The plug-in takes their values whatever
/// the operators of the conditions are.
inline constexpr std::string_view kProductColumn = "PRODUCT";
inline constexpr std::string_view kVersionColumn = "VERSION";
inline constexpr std::string_view kTargetColumn = "TARGETMSN";
inline constexpr std::string_view kOptionalColumn = "OPTIONAL";
inline constexpr std::string_view kContextColumn = "CONTEXT";
inline constexpr std::string_view kMetafileColumn = "UACONFIG";
inline constexpr std::string_view kScriptsColumn = "UASCRIPT";
/// These hold text or names of files; all others hold names in ASCII.
inline constexpr std::array<std::string_view, 3> kTextColumns = {kContextColumn, kMetafileColumn,
                                                                 kScriptsColumn};
/// In both tables: these hold whatever somebody wrote, so there may be passwords in them.
inline constexpr std::array<std::string_view, 5> kFreeTextColumns = {
    kContextColumn, kOptionalColumn, kMetafileColumn, kScriptsColumn, "RETMSGPARM"};

constexpr bool holdsFreeText(std::string_view column) {
    for (const std::string_view free : kFreeTextColumns) {
        if (column == free) return true;
    }
    return false;
}

/// In the request table: the node that answers. No parameter.
inline constexpr std::string_view kOriginNodeColumn = "ORIGINNODE";
/// In the answer: the message that says why, and its values.
inline constexpr std::string_view kMessageColumn = "RETMSGID";
inline constexpr std::string_view kMessageValuesColumn = "RETMSGPARM";
/// In the request table: what only the answer has.
inline constexpr std::array<std::string_view, 3> kResultColumns = {kRetvalColumn, kMessageColumn,
                                                                   kMessageValuesColumn};
/// The commands that guards tell apart.
inline constexpr std::string_view kStart = "START";
inline constexpr std::string_view kStop = "STOP";
inline constexpr std::string_view kRestart = "RESTART";
inline constexpr std::string_view kInstall = "INSTALL";
inline constexpr std::string_view kUninstall = "UNINSTALL";
inline constexpr std::string_view kSetConfiguration = "SETCONFIG";
inline constexpr std::string_view kRemoveInstance = "REMOVEINSTANCE";
inline constexpr std::string_view kGetConfiguration = "GETCONFIG";
/// What the last command of a GETCONFIG writes before this is no part of the configuration.
inline constexpr std::string_view kConfigurationBegin = "INSTANCE=";

/// SETCONFIG's context and GETCONFIG's answer are an agent's configuration, passwords among it.
constexpr bool holdsConfiguration(std::string_view command) {
    return command == kSetConfiguration || command == kGetConfiguration;
}

/// With this in OPTIONAL, the target of a START is the name of an instance.
inline constexpr std::string_view kTargetIsInstance = "INSTANCE";
/// An INSTALL with this OPTIONAL has two outcomes: one with kAccepted when it begins, since it may
/// end the process, and one at its end. One that cannot begin has only that outcome.
inline constexpr std::string_view kWithRestart = "REQUIRES_RESTART";

constexpr bool mayRestart(std::string_view command, std::string_view optional) {
    return command == kInstall && optional == kWithRestart;
}

/// Answers with the result that such an install left in the depot.
inline constexpr std::string_view kCompleteInstall = "COMPLETE_INSTALL";
/// Stands for the product's folder of the depot in the command of an INSTALL.
inline constexpr std::string_view kDeployFolderToken = "|DEPLOYDIR|";

/// The product code of the universal agent, in whatever case when it is configured.
inline constexpr std::string_view kUniversalAgent = "um";
/// The component whose programs all products share, among them the translator.
inline constexpr std::string_view kSharedComponent = "ax";
/// Its folder of the depot is the same for all versions.
inline constexpr std::string_view kCommonInstaller = "ci";

/// These commands fail for a product that is not installed.
inline constexpr std::array<std::string_view, 5> kCommandsOnProducts = {
    kStart, kStop, kRestart, kUninstall, kSetConfiguration};

constexpr bool needsProduct(std::string_view command) {
    for (const std::string_view needing : kCommandsOnProducts) {
        if (command == needing) return true;
    }
    return false;
}

/// Whether the command, until it is over, may change which products and instances there are.
constexpr bool changesWhatIsInstalled(std::string_view command) {
    return command != kStart && command != kStop && command != kRestart;
}

/// These commands have been carried out when their request is answered. All others are queued.
inline constexpr std::array<std::string_view, 2> kCommandsAtOnce = {kGetConfiguration,
                                                                    kCompleteInstall};

/// These are queued, unless one of these columns has no value; then they are refused.
struct QueuedCommand {
    std::string_view name;
    std::array<std::string_view, 3> required;  ///< the rest is empty
};

inline constexpr std::array<QueuedCommand, 7> kQueuedCommands = {
    {{kStart, {kProductColumn}},
     {kStop, {kProductColumn}},
     {kRestart, {kProductColumn}},
     {kInstall, {kProductColumn, kVersionColumn, kContextColumn}},
     {kUninstall, {kProductColumn}},
     {kSetConfiguration, {kProductColumn}},
     {kRemoveInstance, {kProductColumn, kTargetColumn}}}};

constexpr bool runsAtOnce(std::string_view command) {
    for (const std::string_view atOnce : kCommandsAtOnce) {
        if (command == atOnce) return true;
    }
    return false;
}

}  // namespace host::plugin
