#include "fleet/bus/messages/order.h"

#include <sodium.h>

#include <algorithm>
#include <array>
#include <nlohmann/json.hpp>
#include <optional>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/trust/signed.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr std::size_t kIdDigits = 32;
constexpr std::size_t kSumDigits = 64;
constexpr std::size_t kMostFiles = 1'000;

bool isHexadecimal(std::string_view text, std::size_t digits) {
    return text.size() == digits && std::all_of(text.begin(), text.end(), [](char c) {
               return (c >= '0' && c <= '9') || (c >= 'a' && c <= 'f');
           });
}

json documentOf(const OrderFile& file) {
    return {{"path", file.path}, {"sha256", file.sha256}, {"size", file.size}};
}

OrderFile fileOf(const json& document) {
    if (!document.is_object()) throw MessageError("one of the files is no object");
    OrderFile file;
    file.path = textIn(document, "path");
    file.sha256 = textIn(document, "sha256");
    file.size = numberIn(document, "size");
    if (!isHexadecimal(file.sha256, kSumDigits)) throw MessageError("a file's sum is none");
    return file;
}

std::vector<OrderFile> filesIn(const json& document) {
    const auto list = document.find("files");
    if (list == document.end() || !list->is_array())
        throw MessageError("there is no list of files");
    if (list->size() > kMostFiles) throw MessageError("there are more than 1,000 files");
    std::vector<OrderFile> files;
    std::transform(list->begin(), list->end(), std::back_inserter(files), fileOf);
    return files;
}

std::string bodyIn(const json& document) {
    const auto body = document.find("body");
    if (body == document.end() || !body->is_object()) throw MessageError("there is no body");
    return textOf(*body);
}

}  // namespace

bool isOrderId(std::string_view text) {
    return isHexadecimal(text, kIdDigits);
}

bool isDepotPath(std::string_view path) {
    constexpr std::size_t kLongestPath = 255;
    if (path.empty() || path.size() > kLongestPath) return false;
    const auto isOdd = [](char c) { return static_cast<unsigned char>(c) < ' ' || c == '\\'; };
    if (std::any_of(path.begin(), path.end(), isOdd)) return false;
    for (std::size_t begin = 0; begin <= path.size();) {
        const std::size_t end = std::min(path.find('/', begin), path.size());
        const std::string_view name = path.substr(begin, end - begin);
        if (name.empty() || name == "." || name == "..") return false;
        begin = end + 1;
    }
    return true;
}

std::string makeOrderId() {
    if (sodium_init() < 0) throw MessageError("libsodium cannot be used");
    std::array<unsigned char, kIdDigits / 2> bits{};
    randombytes_buf(bits.data(), bits.size());
    std::string id(kIdDigits + 1, '\0');
    sodium_bin2hex(id.data(), id.size(), bits.data(), bits.size());
    id.pop_back();
    return id;
}

std::string textOfOrder(const Order& order) {
    json files = json::array();
    for (const OrderFile& file : order.files)
        files.push_back(documentOf(file));
    const json document = {{"fleet", order.fleet},
                           {"order", order.id},
                           {"host", order.host},
                           {"selector", order.selector},
                           {"kind", order.kind},
                           {"body", readDocument(order.body)},
                           {"files", std::move(files)},
                           {"issued", order.issued.count()},
                           {"expires", order.expires.count()}};
    return textOf(document);
}

std::string signOrder(const Order& order, const KeyPair& key, std::string_view certificate) {
    return signMessage(Purpose::Ordering, key, textOfOrder(order), certificate);
}

SignedOrder readOrder(std::string_view bytes) {
    const std::optional<SignedParts> parts = partsOf(bytes);
    if (!parts) throw MessageError("it is no signed message");
    const json document = readDocument(parts->text);
    SignedOrder read;
    read.bytes = bytes;
    read.certificate = parts->carried;
    Order& order = read.order;
    order.fleet = textIn(document, "fleet");
    order.id = textIn(document, "order");
    order.host = textIn(document, "host");
    order.selector = textIn(document, "selector");
    order.kind = textIn(document, "kind");
    order.body = bodyIn(document);
    order.files = filesIn(document);
    order.issued = momentIn(document, "issued");
    order.expires = momentIn(document, "expires");
    if (!isOrderId(order.id)) throw MessageError("the order's identifier is none");
    return read;
}

bool isSignedByOperator(const SignedOrder& order, std::string_view key) {
    const std::optional<SignedParts> parts = partsOf(order.bytes);
    return parts && isSigned(*parts, Purpose::Ordering, key);
}

}  // namespace fleet
