#include "fleet/bus/messages/numbered_order.h"

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/order.h"
#include "fleet/bus/trust/signed.h"

using nlohmann::json;

namespace fleet {

std::string signNumber(const std::string& host, Number number, const std::string& order,
                       std::string_view orderBytes, const KeyPair& centre) {
    const json document = {{"host", host}, {"n", number}, {"order", order}};
    return signMessage(Purpose::Numbering, centre, textOf(document), orderBytes);
}

std::optional<NumberedOrder> readNumber(std::string_view bytes, const std::string& host,
                                        Number number, const std::vector<std::string>& centres) {
    const std::optional<SignedParts> parts = partsOf(bytes);
    if (!parts || !isSigned(*parts, Purpose::Numbering, centres)) return std::nullopt;
    try {
        const json document = readDocument(parts->text);
        if (textIn(document, "host") != host || numberIn(document, "n") != number) {
            return std::nullopt;
        }
        NumberedOrder numbered{textIn(document, "order"), parts->carried};
        if (!isOrderId(numbered.order)) return std::nullopt;
        return numbered;
    } catch (const MessageError&) {
        return std::nullopt;
    }
}

std::optional<std::string> orderNamedIn(std::string_view bytes) {
    const std::optional<SignedParts> parts = partsOf(bytes);
    if (!parts) return std::nullopt;
    try {
        std::string order = textIn(readDocument(parts->text), "order");
        if (!isOrderId(order)) return std::nullopt;
        return order;
    } catch (const MessageError&) {
        return std::nullopt;
    }
}

}  // namespace fleet
