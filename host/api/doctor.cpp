// GET /v1/doctor

#include <nlohmann/json.hpp>

#include "host/api/route.h"
#include "host/api/schema.h"
#include "host/api/services.h"
#include "host/checks/check_list.h"

namespace host {

Endpoint getDoctor;
Schema doctorSchema;

http::Answer getDoctor(Services& services, const Call&) {
    const CodePage& codePage = services.codePage;
    CheckSubject subject = services.checkSubject();
    nlohmann::ordered_json document = nlohmann::ordered_json::array();
    for (const CheckResult& result : runChecks(subject)) {
        document.push_back({{"check", result.check},
                            {"result", nameOf(result.finding.verdict)},
                            {"text", codePage.toUtf8(result.finding.text)},
                            {"remedy", codePage.toUtf8(result.finding.remedy)}});
    }
    return http::jsonReply(200, document.dump());
}

nlohmann::ordered_json doctorSchema(Components&) {
    const nlohmann::ordered_json check = shape::object(
        "Check", "What one check of the home and the machine found.",
        {{"check", shape::text("the check's name")},
         {"result",
          shape::oneOf("error: a guarded host refuses to start",
                       {nameOf(Verdict::Ok), nameOf(Verdict::Warning), nameOf(Verdict::Error)})},
         {"text", shape::text("what was found")},
         {"remedy", shape::text("what to do; empty if there is nothing to do")}});
    nlohmann::ordered_json checks = shape::listOf("The checks in their order.", check);
    checks["title"] = "Checks";
    return checks;
}

}  // namespace host
