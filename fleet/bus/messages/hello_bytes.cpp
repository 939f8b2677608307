#include "fleet/bus/messages/hello_bytes.h"

#include <nlohmann/json.hpp>
#include <optional>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/order.h"
#include "fleet/bus/trust/signed.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr std::size_t kMostOrders = 20'000;
constexpr std::size_t kMostKeys = 10'000;
/// Of what stands for something: sessions, machines, journals.
constexpr std::size_t kLongestName = 128;
constexpr std::size_t kLongestReason = 4096;

/// `signer` is a key, or several of which one has signed.
template <typename Signer>
json readSigned(std::string_view bytes, Purpose purpose, const std::string& host,
                const Signer& signer) {
    const std::optional<SignedParts> parts = partsOf(bytes);
    if (!parts || !isSigned(*parts, purpose, signer)) throw MessageError("the signature is wrong");
    json document = readDocument(parts->text);
    if (textIn(document, "host") != host) throw MessageError("it is about another host");
    return document;
}

std::string shortTextIn(const json& document, const char* member, std::size_t longest) {
    std::string text = textIn(document, member);
    if (text.size() > longest) throw MessageError('"' + std::string(member) + "\" is too long");
    return text;
}

/// They become parts of requests to the host, so nothing but identifiers is let through.
std::vector<std::string> ordersIn(const json& document, const char* member) {
    std::vector<std::string> orders = textsIn(document, member, kMostOrders);
    for (const std::string& order : orders) {
        if (!isOrderId(order)) throw MessageError("an order's identifier is none");
    }
    return orders;
}

std::string orderIn(const json& document) {
    std::string order = textIn(document, "order");
    if (!isOrderId(order)) throw MessageError("an order's identifier is none");
    return order;
}

std::optional<std::vector<HeldOrder>> heldIn(const json& document) {
    const auto list = document.find("have");
    if (list == document.end()) return std::nullopt;
    if (!list->is_array() || list->size() > kMostOrders) throw MessageError("\"have\" is no list");
    std::vector<HeldOrder> have;
    for (const json& held : *list) {
        if (!held.is_object()) throw MessageError("\"have\" holds something else than orders");
        have.push_back({orderIn(held), numberIn(held, "n")});
    }
    return have;
}

}  // namespace

std::string signHello(const std::string& host, const Hello& hello, const KeyPair& key) {
    json document = {{"host", host},
                     {"session", hello.session},
                     {"nonce", hello.nonce},
                     {"machine", hello.machine},
                     {"time", hello.time.count()},
                     {"taken", hello.taken},
                     {"journal", hello.journal},
                     {"journal_now", hello.journalNow},
                     {"blocked", hello.blocked}};
    if (hello.have) {
        json& have = document["have"] = json::array();
        for (const HeldOrder& held : *hello.have) {
            have.push_back({{"order", held.order}, {"n", held.number}});
        }
    }
    return signMessage(Purpose::Greeting, key, textOf(document));
}

Hello readHello(std::string_view bytes, const std::string& host, std::string_view key) {
    const json document = readSigned(bytes, Purpose::Greeting, host, key);
    Hello hello;
    hello.session = shortTextIn(document, "session", kLongestName);
    hello.nonce = shortTextIn(document, "nonce", kLongestName);
    hello.machine = shortTextIn(document, "machine", kLongestName);
    hello.time = momentIn(document, "time");
    hello.taken = numberIn(document, "taken");
    hello.journal = shortTextIn(document, "journal", kLongestName);
    hello.journalNow = shortTextIn(document, "journal_now", kLongestName);
    hello.blocked = shortTextIn(document, "blocked", kLongestReason);
    hello.have = heldIn(document);
    return hello;
}

std::string signReply(const std::string& host, const Reply& reply, const KeyPair& centre) {
    const json document = {{"host", host},
                           {"nonce", reply.nonce},
                           {"time", reply.time.count()},
                           {"over", reply.over},
                           {"last", reply.last},
                           {"open", reply.open},
                           {"forget", reply.forget},
                           {"list", reply.list},
                           {"stop", reply.stop},
                           {"revoked", reply.revoked}};
    return signMessage(Purpose::Replying, centre, textOf(document));
}

Reply readReply(std::string_view bytes, const std::string& host,
                const std::vector<std::string>& centres) {
    const json document = readSigned(bytes, Purpose::Replying, host, centres);
    Reply reply;
    reply.nonce = textIn(document, "nonce");
    reply.time = momentIn(document, "time");
    reply.over = numberIn(document, "over");
    reply.last = numberIn(document, "last");
    reply.open = ordersIn(document, "open");
    reply.forget = flagIn(document, "forget");
    reply.list = flagIn(document, "list");
    reply.stop = textIn(document, "stop");
    reply.revoked = textsIn(document, "revoked", kMostKeys);
    return reply;
}

std::string signOutcome(const Outcome& outcome, const KeyPair& key) {
    json document = {{"host", outcome.host},
                     {"n", outcome.number},
                     {"order", outcome.order},
                     {"journal", outcome.journal},
                     {"state", outcome.state}};
    // The host's document goes along as it is, so that the same outcome is the same bytes.
    return signMessage(Purpose::Reporting, key, textOf(document), outcome.task);
}

Outcome readOutcome(std::string_view bytes, const std::string& host, std::string_view key) {
    const json document = readSigned(bytes, Purpose::Reporting, host, key);
    Outcome outcome;
    outcome.host = host;
    outcome.number = numberIn(document, "n");
    outcome.order = orderIn(document);
    outcome.journal = shortTextIn(document, "journal", kLongestName);
    outcome.state = shortTextIn(document, "state", kLongestName);
    const std::string_view task = partsOf(bytes)->carried;
    if (!task.empty()) readDocument(task);
    outcome.task = task;
    return outcome;
}

}  // namespace fleet
