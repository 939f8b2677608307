// version: that of this program.

#include <nlohmann/json.hpp>

#include "ctl/show/page.h"
#include "ctl/verbs/invocation.h"
#include "fleet/operator/verbs/fleet_verbs.h"

namespace fleet {
namespace {

ctl::ExitStatus runVersion(const ctl::Invocation& invocation) {
    if (invocation.format == ctl::Format::Json) {
        return ctl::print(ctl::jsonPage({{"zavctl-fleet", ZAV_VERSION}}));
    }
    return ctl::print({"zavctl-fleet " ZAV_VERSION "\n", {}});
}

}  // namespace

constexpr ctl::Verb kFleetVersionVerb = {
    "version",
    "Show the version of the program for fleets",
    {},
    {"zavctl --fleet https://centre.example version",
     "zavctl --fleet https://centre.example --json version"},
    runVersion,
};

}  // namespace fleet
