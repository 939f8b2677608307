/// An order with its number, as the centre publishes it.
#pragma once

#include <optional>
#include <string>
#include <string_view>
#include <vector>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/messages/values.h"

namespace fleet {

/// Signs that this order, whose bytes are as its operator signed them, has this number for that
/// host.
std::string signNumber(const std::string& host, Number number, const std::string& order,
                       std::string_view orderBytes, const KeyPair& centre);

/// What the centre says about an order.
struct NumberedOrder {
    std::string order;       ///< the identifier that it saw
    std::string_view bytes;  ///< the order, signed by its operator
};

/// The order that has this number for this host; nothing if none of the centre's keys has signed
/// such a thing: orders that an earlier key has numbered still wait when there is a newer one. What
/// it returns refers to the bytes.
std::optional<NumberedOrder> readNumber(std::string_view bytes, const std::string& host,
                                        Number number, const std::vector<std::string>& centres);

/// The order's identifier in a message of any host, whoever has signed it: for who made it himself
/// and finds it again. Nothing if it is no such message.
std::optional<std::string> orderNamedIn(std::string_view bytes);

}  // namespace fleet
