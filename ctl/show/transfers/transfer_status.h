/// What the host says of a file that it is sent, in words.
#pragma once

#include <string>

#include "ctl/client/transfer/transfer_client.h"

namespace ctl {

/// The meaning of an answer: of its fault if it has one, else of its status.
std::string statusText(const TransferAnswer& answer);

}  // namespace ctl
