// GET /v1/ready

#include <nlohmann/json.hpp>

#include "host/api/route.h"
#include "host/api/schema.h"
#include "host/api/services.h"
#include "host/tables/plugin_facts.h"

namespace host {
namespace {

using Document = nlohmann::ordered_json;

class Reasons {
public:
    explicit Reasons(const CodePage& codePage) : codePage_(codePage) {}

    void add(const char* part, const std::string& text) {
        list_.push_back({{"part", part}, {"text", codePage_.toUtf8(text)}});
    }
    const Document& list() const { return list_; }

private:
    const CodePage& codePage_;
    Document list_ = Document::array();
};

void lookAtPlugin(const Services& services, Reasons& reasons) {
    for (const std::string_view table : {plugin::kRequestTable, plugin::kOutcomeTable}) {
        if (services.tables.find(std::string(table)) != nullptr) continue;
        reasons.add("plugin", "the plug-in offers no table " + std::string(table));
    }
}

void lookAtJournal(Services& services, Reasons& reasons) {
    const std::string trouble = services.journal.trouble();
    if (!trouble.empty()) reasons.add("journal", trouble);
    if (!services.journal.hasRoom()) {
        reasons.add("disk", "there is no room for the journal's reserve");
    }
}

void lookAtWaits(const Services& services, Reasons& reasons) {
    if (!services.leftovers.gone()) {
        reasons.add("leftovers",
                    "commands that an earlier run of the host began have not ended yet");
    }
    if (services.dispatcher.awaitsInstall() || services.tasks.restartsHost()) {
        reasons.add("install", "an install that may restart the host has not ended yet");
    }
}

}  // namespace

Endpoint getReady;
Schema readySchema;

http::Answer getReady(Services& services, const Call&) {
    Reasons reasons(services.codePage);
    lookAtPlugin(services, reasons);
    lookAtJournal(services, reasons);
    lookAtWaits(services, reasons);
    const bool ready = reasons.list().empty();
    const Document document = {{"ready", ready}, {"reasons", reasons.list()}};
    return http::jsonReply(ready ? 200 : 503, document.dump());
}

nlohmann::ordered_json readySchema(Components&) {
    const nlohmann::ordered_json reason = shape::object(
        "Reason", "Why a host does not carry out commands.",
        {{"part",
          shape::oneOf("what is not ready", {"plugin", "journal", "disk", "leftovers", "install"})},
         {"text", shape::text("a sentence")}});
    return shape::object("Ready", "Whether the host takes and carries out commands.",
                         {{"ready", shape::yesOrNo("whether it does")},
                          {"reasons", shape::listOf("why not; empty if it does", reason)}});
}

}  // namespace host
