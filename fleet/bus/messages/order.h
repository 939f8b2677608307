/// What an operator wants of one host, made and signed on his own machine.
#pragma once

#include <string>
#include <string_view>
#include <vector>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/bus/messages/values.h"

namespace fleet {

/// A file that the order needs in the host's depot.
struct OrderFile {
    std::string path;  ///< below the depot
    std::string sha256;
    Number size = 0;
};

struct Order {
    std::string fleet;
    std::string id;    ///< 32 hexadecimal digits in lower case
    std::string host;  ///< its bus key
    std::string
        selector;      ///< the one that chose the host; the link tries it on the host's own labels
    std::string kind;  ///< a command of the host's tasks, or kCancel
    std::string body;  ///< JSON: the other members of the task, or of what is cancelled
    std::vector<OrderFile> files;
    Moment issued{};
    Moment expires{};
};

/// The kind of an order that cancels another one, whose identifier its body names as "order".
constexpr const char* kCancel = "CANCEL";

/// The kind of an order that only brings files into the host's depot.
constexpr const char* kPush = "PUSH";

/// Whether a file of an order may have this path: names joined by "/", none of them empty, "." or
/// "..", without control characters and backslashes.
bool isDepotPath(std::string_view path);

/// An order may wait so long at most.
constexpr Moment kLongestOrder{7LL * 24 * 60 * 60 * 1000};

/// Whether a text can be an order's identifier.
bool isOrderId(std::string_view text);
/// A new one, of 128 random bits.
std::string makeOrderId();

/// The text that an order's signature covers.
std::string textOfOrder(const Order& order);
/// Signs an order and adds the operator's certificate.
std::string signOrder(const Order& order, const KeyPair& key, std::string_view certificate);

/// A signed order's parts, whoever has signed it.
struct SignedOrder {
    Order order;
    std::string_view bytes;        ///< the whole message
    std::string_view certificate;  ///< of who claims to have signed it
};

/// Reads an order. Throws MessageError for anything that is none. What it returns refers to the
/// bytes.
SignedOrder readOrder(std::string_view bytes);
bool isSignedByOperator(const SignedOrder& order, std::string_view key);

}  // namespace fleet
