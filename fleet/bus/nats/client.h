/// The C client library in terms of this folder. Included by its sources only.
#pragma once

#include <nats/nats.h>

#include <memory>
#include <string>
#include <string_view>

#include "fleet/bus/nats/status.h"

namespace fleet {

struct FreeOfNats {
    void operator()(natsMsg* message) const { natsMsg_Destroy(message); }
    void operator()(natsOptions* options) const { natsOptions_Destroy(options); }
};
using NatsMessage = std::unique_ptr<natsMsg, FreeOfNats>;
using NatsOptions = std::unique_ptr<natsOptions, FreeOfNats>;

/// What a result of the library means for who asked. Its own words stand behind `what`.
BusStatus statusOf(natsStatus result, const std::string& what);

/// Null, with the reason in `status`, if it cannot be sent: the subjects are none, or a header
/// holds an end of a line.
NatsMessage makeMessage(const std::string& subject, const std::string& reply,
                        std::string_view bytes, const BusHeaders& headers, BusStatus& status);

/// A copy.
BusMessage messageOf(natsMsg* message);

}  // namespace fleet
