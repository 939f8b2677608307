#include "fleet/bus/messages/facts.h"

#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/trust/signed.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr std::size_t kMostLabels = 256;
/// Of names, labels, versions and what stands for a journal.
constexpr std::size_t kLongestWord = 256;
constexpr std::size_t kLongestBlocked = 4096;
/// The end of the year 2199. Later times could not be shown.
constexpr Moment kLatestTime{7'258'118'400'000};

std::string boundedText(const json& document, const char* member, std::size_t longest) {
    std::string text = textIn(document, member);
    if (text.size() > longest) throw MessageError('"' + std::string(member) + "\" is too long");
    return text;
}

Moment timeIn(const json& document) {
    const Moment time = momentIn(document, "time");
    if (time >= kLatestTime) throw MessageError("\"time\" is too late");
    return time;
}

Labels labelsIn(const json& document) {
    const auto found = document.find("labels");
    const bool isSome =
        found != document.end() && found->is_object() && found->size() <= kMostLabels;
    if (!isSome) throw MessageError("\"labels\" are none");
    Labels labels;
    for (const auto& [name, value] : found->items()) {
        if (name.size() > kLongestWord) throw MessageError("a label's name is too long");
        labels[name] = boundedText(*found, name.c_str(), kLongestWord);
    }
    return labels;
}

std::optional<Inventory> inventoryIn(const json& document) {
    const auto found = document.find("inventory");
    if (found == document.end()) return std::nullopt;
    if (!found->is_object()) throw MessageError("\"inventory\" is no object");
    Inventory inventory;
    inventory.time = timeIn(*found);
    json content = *found;
    content.erase("time");
    inventory.document = textOf(content);
    return inventory;
}

}  // namespace

bool saySame(const Facts& a, const Facts& b) {
    const auto contentOf = [](const Facts& facts) {
        return facts.inventory ? facts.inventory->document : std::string();
    };
    return a.host == b.host && a.name == b.name && a.labels == b.labels && a.link == b.link &&
           a.version == b.version && a.journal == b.journal && a.blocked == b.blocked &&
           a.inventory.has_value() == b.inventory.has_value() && contentOf(a) == contentOf(b);
}

std::string signFacts(const Facts& facts, const KeyPair& key) {
    json document = {{"host", facts.host},       {"time", facts.time.count()},
                     {"name", facts.name},       {"labels", json::object()},
                     {"link", facts.link},       {"version", facts.version},
                     {"journal", facts.journal}, {"blocked", facts.blocked}};
    for (const auto& [name, value] : facts.labels)
        document["labels"][name] = value;
    if (facts.inventory) {
        document["inventory"] = readDocument(facts.inventory->document);
        document["inventory"]["time"] = facts.inventory->time.count();
    }
    return signMessage(Purpose::Describing, key, textOf(document));
}

Facts readFacts(std::string_view bytes, const std::string& host, std::string_view key) {
    if (bytes.size() > kMostFactsBytes) throw MessageError("it is too long");
    const std::optional<SignedParts> parts = partsOf(bytes);
    if (!parts || !isSigned(*parts, Purpose::Describing, std::string(key))) {
        throw MessageError("the signature is wrong");
    }
    const json document = readDocument(parts->text);
    Facts facts;
    facts.host = textIn(document, "host");
    if (facts.host != host) throw MessageError("it is about another host");
    facts.time = timeIn(document);
    facts.name = boundedText(document, "name", kLongestWord);
    facts.labels = labelsIn(document);
    facts.link = boundedText(document, "link", kLongestWord);
    facts.version = boundedText(document, "version", kLongestWord);
    facts.journal = boundedText(document, "journal", kLongestWord);
    facts.blocked = boundedText(document, "blocked", kLongestBlocked);
    facts.inventory = inventoryIn(document);
    return facts;
}

}  // namespace fleet
