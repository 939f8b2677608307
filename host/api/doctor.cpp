// GET /v1/doctor

#include <nlohmann/json.hpp>

#include "host/api/route.h"
#include "host/api/services.h"
#include "host/checks/check_list.h"

namespace host {

Endpoint getDoctor;

Answer getDoctor(Services& services, const Call&) {
    const CodePage& codePage = services.codePage;
    CheckSubject subject = services.checkSubject();
    nlohmann::ordered_json document = nlohmann::ordered_json::array();
    for (const CheckResult& result : runChecks(subject)) {
        document.push_back({{"check", result.check},
                            {"result", nameOf(result.finding.verdict)},
                            {"text", codePage.toUtf8(result.finding.text)},
                            {"remedy", codePage.toUtf8(result.finding.remedy)}});
    }
    return jsonReply(200, document.dump());
}

}  // namespace host
