#include "fleet/operator/verbs/operator_side.h"

#include <cstdlib>
#include <optional>
#include <string>

#include "ctl/client/failure.h"
#include "ctl/show/page.h"
#include "ctl/show/printable.h"
#include "ctl/show/time_text.h"
#include "fleet/operator/identity/operator_files.h"
#include "fleet/operator/verbs/fleet_arguments.h"

namespace fleet {
namespace {

constexpr const char* kFleetVariable = "ZAV_FLEET";
constexpr std::chrono::hours kSoonOver{24 * 30};
constexpr std::chrono::hours kNoLimit{24 * 365};

std::string urlOf(const ctl::Values& given) {
    if (!given.text(kFleet).empty()) return given.text(kFleet);
    const char* const value = std::getenv(kFleetVariable);
    if (value != nullptr && *value != '\0') return value;
    throw ctl::Failure(ctl::kWrongUsage, "no fleet is named",
                       "Give its centre with --fleet URL, or set $ZAV_FLEET.");
}

OperatorIdentity identityAt(const std::string& url) {
    std::optional<OperatorIdentity> identity =
        OperatorFiles(OperatorFiles::usualDirectory()).identity(url);
    if (identity) return std::move(*identity);
    throw ctl::Failure(ctl::kWrongUsage, "you have not logged in at " + ctl::printable(url),
                       "zavctl login INVITATION does; an administrator has the invitation.");
}

void warnOfEnd(const Certificate& grant) {
    const auto left = grant.until - wallClock();
    if (left > kSoonOver) return;
    const auto seconds = std::chrono::duration_cast<std::chrono::seconds>(left);
    ctl::print({{},
                ctl::complaint(seconds.count() <= 0
                                   ? std::string("note: your certificate has ended")
                                   : "note: your certificate ends in " + ctl::spanText(seconds))});
}

}  // namespace

ctl::Deadline deadlineOf(const ctl::Values& given) {
    if (!given.has(kFleetTimeout)) return ctl::deadlineIn(kNoLimit);
    return ctl::deadlineIn(
        std::chrono::milliseconds(static_cast<long long>(given.seconds(kFleetTimeout) * 1000.0)));
}

OperatorSide::OperatorSide(const ctl::Invocation& invocation)
    : identity(identityAt(urlOf(invocation.given))),
      deadline(deadlineOf(invocation.given)),
      centre(identity, deadline) {
    warnOfEnd(identity.grant());
}

}  // namespace fleet
