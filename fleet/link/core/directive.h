/// One order as the link sees it once its signatures are checked.
#pragma once

#include <string>
#include <vector>

#include "fleet/bus/messages/order.h"
#include "fleet/bus/messages/values.h"

namespace fleet {

struct Directive {
    Number number = 0;
    std::string order;    ///< its identifier, and the TRANSID of the host's task
    std::string cancels;  ///< the order that this one cancels; "" for all other kinds
    bool hasFiles = false;
    bool onlyBringsFiles = false;  ///< it is done when they lie where they belong
    std::vector<OrderFile> files;
    std::string signer;  ///< the operator's signing key
    Moment issued{};
    Moment expires{};
    Moment allowedUntil{};  ///< when the operator's certificate ends
    /// Why signature, certificate, role or selector forbid it; "" if they do not. Times are judged
    /// when its turn has come.
    std::string refusal;
    std::string
        request;  ///< for the host: the body of its POST /v1/tasks but for what the link adds
};

}  // namespace fleet
