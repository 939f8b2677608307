// POST /v1/hosts/{host}/labels: an admin gives a host other labels.

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/server/api/documents/host_sight.h"
#include "fleet/server/api/schema.h"
#include "fleet/server/keys/files/keys_error.h"
#include "fleet/server/keys/trust/names.h"

namespace fleet {

ApiEndpoint postLabels;
Schema labelsSchema;

namespace {

/// By the rules of those that an invitation names.
Labels labelsIn(const nlohmann::json& object) {
    std::string text;
    for (const auto& [name, value] : object.items()) {
        if (!value.is_string()) {
            throw routes::BadRequest("the label \"" + name + "\" has no text as its value");
        }
        text += (text.empty() ? "" : ",") + name + '=' + value.get<std::string>();
    }
    try {
        Labels labels = labelsOf(text);
        if (labels.size() != object.size())
            throw KeysError("a label has a character that none has");
        return labels;
    } catch (const KeysError& error) {
        throw routes::BadRequest(error.what());
    }
}

}  // namespace

http::Answer postLabels(Visit& visit, const Call& call) {
    if (!visit.isAdmin()) throw Forbidden("labels are for admins");
    const Labels labels = labelsIn(call.body().at("labels"));
    const std::string host = hostNamed(visit, *visit.services.members(), call.required("host"));
    visit.services.label(host, labels);
    const auto members = visit.services.members();
    return http::jsonReply(
        200, textOf(hostDocument(sightsOf(visit, *members, {host}).front(), wallClock())));
}

nlohmann::ordered_json labelsSchema(Components&) {
    nlohmann::ordered_json labels = labelsShape("Labels of a host.");
    labels["title"] = "Labels";
    return labels;
}

}  // namespace fleet
