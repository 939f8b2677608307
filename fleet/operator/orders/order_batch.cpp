#include "fleet/operator/orders/order_batch.h"

#include <nlohmann/json.hpp>

#include "ctl/client/http/percent_encoding.h"
#include "fleet/bus/messages/document.h"
#include "fleet/operator/centre/answers.h"

using nlohmann::json;

namespace fleet {
namespace {

/// A request ends with the order that reaches this, as text.
constexpr std::size_t kRequestBytes = std::size_t{500} * 1024;
/// What an order's text needs in a request beyond its own length.
constexpr std::size_t kAroundAnOrder = 3;

/// As many orders, from a place on, as go into one request.
json nextOrders(const std::vector<std::string>& orders, std::size_t& place) {
    json texts = json::array();
    std::size_t bytes = 0;
    while (place < orders.size()) {
        std::string text = base64Of(orders[place]);
        bytes += text.size() + kAroundAnOrder;
        if (!texts.empty() && bytes > kRequestBytes) break;
        texts.push_back(std::move(text));
        ++place;
    }
    return texts;
}

}  // namespace

std::string sendOrders(Centre& centre, const std::vector<std::string>& orders,
                       const OnSent& onSent) {
    const std::string batch = memberText(centre.post("/v1/batches", json::object()), "batch");
    if (batch.empty()) throw senseless("it names no batch");
    const std::string target = "/v1/batches/" + ctl::percentEncoded(batch) + "/orders";
    for (std::size_t place = 0; place < orders.size();) {
        const json texts = nextOrders(orders, place);
        const json answer = centre.post(target, {{"orders", texts}});
        if (memberNumber(answer, "orders") != place) {
            throw senseless("it has not as many orders as were sent");
        }
        if (onSent) onSent(place);
    }
    return batch;
}

}  // namespace fleet
