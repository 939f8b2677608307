#include "ctl/show/message_catalogue.h"

#include <array>
#include <nlohmann/json.hpp>

#include "ctl/client/row.h"
#include "ctl/show/printable.h"

namespace ctl {
namespace {

struct Message {
    const char* id;
    const char* text;
};

constexpr std::array<Message, 35> kMessages = {{
    {"ZAV1001E", "the request names no command"},
    {"ZAV1002E", "the request has no transaction identifier"},
    {"ZAV1003E", "the request names no product"},
    {"ZAV1004E", "the request has no context, which this command needs"},
    {"ZAV1005E", "the request names no target managed system"},
    {"ZAV1006E", "the command is not supported"},
    {"ZAV1007E", "no two-way translator was found for the product"},
    {"ZAV1008E", "the two-way translator ended with a bad return code"},
    {"ZAV1009E", "the two-way translator could not be run"},
    {"ZAV1010E", "no agent depot directory is set"},
    {"ZAV1011E", "the universal agent's configuration has no metafile path"},
    {"ZAV1012E", "the universal agent's configuration has no work path"},
    {"ZAV1013E", "the universal agent's configuration has no resource bundle path"},
    {"ZAV1014E", "the metafile could not be copied"},
    {"ZAV1015E", "a script could not be copied"},
    {"ZAV1016E", "the metafile could not be imported"},
    {"ZAV1017E", "the console's DELETE command could not be run"},
    {"ZAV1018E", "the console's IMPORT command could not be run"},
    {"ZAV1019E", "the product is not installed"},
    {"ZAV1020E", "the instance has no configuration file"},
    {"ZAV1021E", "the universal agent's work path is no path of a directory in another"},
    {"ZAV1022E", "the console's GETDPTYPE command could not be run"},
    {"ZAV1023E", "the metafile's data provider type could not be found out"},
    {"ZAV1024E", "the start or stop command ended with a bad return code"},
    {"ZAV1025E", "the start or stop command could not be run"},
    {"ZAV1026E", "the agent instance could not be started"},
    {"ZAV1027E", "the agent instance could not be stopped"},
    {"ZAV1028E", "the universal agent's start-up parameters could not be changed"},
    {"ZAV1029E", "the request names no version"},
    {"ZAV1030E", "the install command could not be run"},
    {"ZAV1031E", "the install command ended with a bad return code"},
    {"ZAV1032E", "the uninstall command ended with a bad return code"},
    {"ZAV1033E", "the uninstall command could not be run"},
    {"ZAV1034E", "the product is not in the inventory of this host"},
    {"ZAV1035I", "for information"},
}};

}  // namespace

std::string messageText(const std::string& id) {
    for (const Message& message : kMessages) {
        if (id == message.id) return message.text;
    }
    return {};
}

std::string describeResult(int returnCode, const std::string& id, const std::string& parameter) {
    if (id.empty() && returnCode == kNoReturnCode) return "the host gave no return code";
    std::string out = id.empty() ? "return code " + std::to_string(returnCode) : printable(id);
    if (const std::string text = messageText(id); !text.empty()) out += ": " + text;
    if (!parameter.empty()) out += " [" + redacted(parameter) + "]";
    return out;
}

std::string describeRow(const nlohmann::json& row) {
    return describeResult(returnCodeOf(row), textOf(row, "RETMSGID"), textOf(row, "RETMSGPARM"));
}

}  // namespace ctl
