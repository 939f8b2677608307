#include "fleet/link/judge.h"

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/certificate.h"
#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/numbered_order.h"
#include "fleet/bus/messages/order.h"

using nlohmann::json;

namespace fleet {
namespace {

/// Members that the link itself gives each task.
constexpr const char* kOwnMembers[] = {"command", "transid",   "once",    "expires", "journal",
                                       "refused", "cancelled", "expired", "done",    "sealed"};

void refuseUnless(bool holds, const char* reason) {
    if (!holds) throw MessageError(reason);
}

/// The body with what was sealed for this host. Throws MessageError.
json openBody(const Order& order, const KeyPair& key) {
    json body = readDocument(order.body);
    const auto sealed = body.find("sealed");
    const bool isSealed = sealed != body.end();
    const std::string bytes = isSealed ? bytesOfBase64(textIn(body, "sealed")) : "";
    for (const char* const member : kOwnMembers)
        body.erase(member);
    if (!isSealed) return body;
    const std::optional<std::string> text = key.unseal(bytes);
    if (!text) throw MessageError("what was sealed was not sealed for this host");
    const json hidden = readDocument(*text);
    for (const auto& [member, value] : hidden.items())
        body[member] = value;
    for (const char* const member : kOwnMembers)
        body.erase(member);
    return body;
}

std::string productIn(const json& body) {
    const auto product = body.find("product");
    if (product == body.end()) return "";
    refuseUnless(product->is_string(), "the order's product is no text");
    return product->get<std::string>();
}

void fill(Directive& directive, const NumberedOrder& numbered, const Trust& trust,
          const KeyPair& key) {
    const SignedOrder read = readOrder(numbered.bytes);
    const Order& order = read.order;
    refuseUnless(order.id == numbered.order,
                 "the order has another identifier than its number says");
    const Certificate certificate = readCertificate(read.certificate, trust.root, trust.fleet);
    refuseUnless(isSignedByOperator(read, certificate.key),
                 "the operator has not signed the order");
    refuseUnless(order.fleet == trust.fleet, "the order is for another fleet");
    refuseUnless(order.host == trust.host, "the order is for another host");
    refuseUnless(order.expires <= order.issued + kLongestOrder, "the order waits for too long");
    directive.signer = certificate.key;
    directive.issued = order.issued;
    directive.expires = order.expires;
    directive.allowedUntil = certificate.until;
    directive.files = order.files;
    directive.hasFiles = !order.files.empty();
    json body = openBody(order, key);
    refuseUnless(allows(certificate, order.kind, productIn(body)),
                 "the operator's certificate does not allow this command for this product");
    refuseUnless(isMeant(certificate.selector, trust),
                 "the operator's certificate is not for hosts with these labels");
    refuseUnless(isMeant(order.selector, trust), "the order is not for hosts with these labels");
    if (order.kind == kCancel) {
        directive.cancels = textIn(body, "order");
        refuseUnless(isOrderId(directive.cancels), "what is to be cancelled is no order");
        return;
    }
    for (const OrderFile& file : order.files)
        refuseUnless(isDepotPath(file.path), "one of the files would not lie in the depot");
    directive.onlyBringsFiles = order.kind == kPush;
    refuseUnless(!directive.onlyBringsFiles || directive.hasFiles, "the order brings no file");
    body["command"] = order.kind;
    directive.request = textOf(body);
}

}  // namespace

bool isMeant(const std::string& selector, const Trust& trust) {
    try {
        return Selector(selector).matches(trust.name, trust.labels);
    } catch (const SelectorError& error) {
        throw MessageError(error.what());
    }
}

std::optional<Directive> judge(std::string_view bytes, Number number, const Trust& trust,
                               const KeyPair& key) {
    const std::optional<NumberedOrder> numbered =
        readNumber(bytes, trust.host, number, trust.centres);
    if (!numbered) return std::nullopt;
    Directive directive;
    directive.number = number;
    directive.order = numbered->order;
    try {
        fill(directive, *numbered, trust, key);
    } catch (const MessageError& error) {
        directive.refusal = error.what();
        directive.cancels.clear();
    }
    return directive;
}

}  // namespace fleet
