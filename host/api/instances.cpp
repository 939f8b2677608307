// GET /v1/instances

#include "host/home/instances.h"

#include <nlohmann/json.hpp>

#include "host/api/route.h"
#include "host/api/schema.h"
#include "host/api/services.h"
#include "host/guard/machine/system_name.h"

namespace host {

Endpoint getInstances;
Schema instancesSchema;

namespace {

nlohmann::ordered_json documentOf(const AgentInstance& instance, const CodePage& codePage) {
    nlohmann::ordered_json document = {
        {"product", codePage.toUtf8(instance.product)},
        {"instance", codePage.toUtf8(instance.instance)},
        {"target", codePage.toUtf8(systemName(instance.product, instance.instance))},
        {"state", nameOf(instance.state)},
        {"user", nullptr},
        {"pid", nullptr}};
    if (!instance.user.empty()) document["user"] = codePage.toUtf8(instance.user);
    if (instance.pid != 0) document["pid"] = instance.pid;
    return document;
}

}  // namespace

http::Answer getInstances(Services& services, const Call&) {
    const CodePage& codePage = services.codePage;
    const InstanceList list = readInstances(services.home);
    if (!list.isOffered) {
        return http::errorReply(404,
                                "the home has no program bin/instances, which tells what runs");
    }
    if (!list.result.succeeded()) {
        return http::errorReply(500, "bin/instances " + endInWords(list.result) + ": " +
                                         codePage.toUtf8(list.result.err));
    }
    nlohmann::ordered_json instances = nlohmann::ordered_json::array();
    for (const AgentInstance& instance : list.instances)
        instances.push_back(documentOf(instance, codePage));
    const nlohmann::ordered_json document = {{"instances", std::move(instances)}};
    return http::jsonReply(200, document.dump());
}

nlohmann::ordered_json instancesSchema(Components&) {
    using State = AgentInstance::State;
    const nlohmann::ordered_json instance = shape::object(
        "Instance", "An instance of an agent that could run.",
        {{"product", shape::text("the product's code")},
         {"instance", shape::text("its name; empty: the default instance")},
         {"target", shape::text("the managed system name by which commands know it")},
         {"state",
          shape::oneOf("missing: it was started, not stopped on request, and does not run",
                       {nameOf(State::Running), nameOf(State::Missing), nameOf(State::Stopped)})},
         {"user", shape::orNull(shape::text("who runs it, or would; null: it is stopped"))},
         {"pid", shape::orNull(shape::wholeNumber("its process; null unless it runs", 1))}});
    return shape::object("Instances", "What the home says of its agents.",
                         {{"instances", shape::listOf("by product and instance", instance)}});
}

}  // namespace host
