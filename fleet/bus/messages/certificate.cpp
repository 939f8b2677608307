#include "fleet/bus/messages/certificate.h"

#include <algorithm>
#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/selector.h"
#include "fleet/bus/trust/signed.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr std::size_t kMostRights = 1'000;
constexpr const char* kCentre = "centre";
constexpr const char* kOperator = "operator";

Certificate::Holder holderIn(const json& document) {
    const std::string holder = textIn(document, "holder");
    if (holder == kCentre) return Certificate::Holder::Centre;
    if (holder == kOperator) return Certificate::Holder::Operator;
    throw MessageError("the certificate is for nobody that is known here");
}

bool fitsOne(const std::vector<std::string>& patterns, std::string_view text) {
    return std::any_of(patterns.begin(), patterns.end(),
                       [&](const std::string& pattern) { return fitsPattern(pattern, text); });
}

}  // namespace

bool allows(const Certificate& certificate, std::string_view command, std::string_view product) {
    if (certificate.holder != Certificate::Holder::Operator) return false;
    if (!fitsOne(certificate.commands, command)) return false;
    return product.empty() || fitsOne(certificate.products, product);
}

std::string signCertificate(const Certificate& certificate, const KeyPair& root) {
    const bool isCentre = certificate.holder == Certificate::Holder::Centre;
    const json document = {
        {"fleet", certificate.fleet},         {"holder", isCentre ? kCentre : kOperator},
        {"name", certificate.name},           {"key", certificate.key},
        {"until", certificate.until.count()}, {"commands", certificate.commands},
        {"products", certificate.products},   {"selector", certificate.selector}};
    return signMessage(Purpose::Certifying, root, textOf(document));
}

Certificate readCertificate(std::string_view bytes, std::string_view root, std::string_view fleet) {
    const std::optional<SignedParts> parts = partsOf(bytes);
    if (!parts || !isSigned(*parts, Purpose::Certifying, root)) {
        throw MessageError("the certificate is not one of the fleet's root");
    }
    const json document = readDocument(parts->text);
    Certificate certificate;
    certificate.fleet = textIn(document, "fleet");
    if (certificate.fleet != fleet) throw MessageError("the certificate is another fleet's");
    certificate.holder = holderIn(document);
    certificate.name = textIn(document, "name");
    certificate.key = textIn(document, "key");
    certificate.until = momentIn(document, "until");
    certificate.commands = textsIn(document, "commands", kMostRights);
    certificate.products = textsIn(document, "products", kMostRights);
    certificate.selector = textIn(document, "selector");
    return certificate;
}

}  // namespace fleet
