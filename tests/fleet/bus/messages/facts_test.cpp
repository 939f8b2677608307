#include "fleet/bus/messages/facts.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>

#include "fleet/bus/messages/document.h"
#include "fleet/bus/trust/signed.h"

namespace {

using fleet::Facts;
using fleet::KeyKind;
using fleet::KeyPair;
using fleet::MessageError;
using fleet::Moment;
using fleet::Purpose;
using nlohmann::json;

const KeyPair& signer() {
    static const KeyPair key = KeyPair::make(KeyKind::User);
    return key;
}

Facts someFacts() {
    Facts facts;
    facts.host = "UHOST";
    facts.time = Moment(1'700'000'000'000);
    facts.name = "web-1";
    facts.labels = {{"env", "test"}, {"site", "a"}};
    facts.link = "1.2.3";
    facts.version = "1.2.4";
    facts.journal = "j1";
    facts.blocked = "no host answers";
    facts.inventory = fleet::Inventory{Moment(1'699'999'999'000), R"({"products":[{"a":"b"}]})"};
    return facts;
}

Facts readBack(const std::string& bytes) {
    return fleet::readFacts(bytes, "UHOST", signer().publicKey());
}

std::string signedText(const json& document, Purpose purpose = Purpose::Describing) {
    return signMessage(purpose, signer(), document.dump());
}

json documentOfFacts() {
    return json::parse(std::string(fleet::partsOf(signFacts(someFacts(), signer()))->text));
}

TEST(HostsFacts, ComeBackAsTheyWereSigned) {
    const Facts read = readBack(signFacts(someFacts(), signer()));
    EXPECT_TRUE(saySame(read, someFacts()));
    EXPECT_EQ(read.time, someFacts().time);
    EXPECT_EQ(read.labels, someFacts().labels);
    ASSERT_TRUE(read.inventory.has_value());
    EXPECT_EQ(read.inventory->time, someFacts().inventory->time);
    EXPECT_EQ(json::parse(read.inventory->document), json::parse(R"({"products":[{"a":"b"}]})"));
    Facts bare = someFacts();
    bare.inventory.reset();
    EXPECT_FALSE(readBack(signFacts(bare, signer())).inventory.has_value());
}

TEST(HostsFacts, OfAnotherHostOrSignerOrPurposeDoNotCount) {
    const std::string bytes = signFacts(someFacts(), signer());
    EXPECT_THROW(fleet::readFacts(bytes, "UOTHER", signer().publicKey()), MessageError);
    EXPECT_THROW(fleet::readFacts(bytes, "UHOST", KeyPair::make(KeyKind::User).publicKey()),
                 MessageError);
    EXPECT_THROW(readBack(signedText(documentOfFacts(), Purpose::Reporting)), MessageError);
    EXPECT_THROW(readBack("nothing of the kind"), MessageError);
}

TEST(HostsFacts, AreBounded) {
    const auto refused = [](const char* member, const json& value) {
        json document = documentOfFacts();
        document[member] = value;
        EXPECT_THROW(readBack(signedText(document)), MessageError) << member << value;
    };
    refused("name", std::string(257, 'x'));
    refused("labels", json::array());
    refused("labels", {{"env", 7}});
    refused("labels", {{std::string(257, 'x'), "v"}});
    refused("blocked", std::string(4097, 'x'));
    refused("inventory", "text");
    refused("inventory", json::object());
    refused("time", 7'258'118'400'000);
    refused("inventory", {{"time", 7'258'118'400'000}});
    json many = json::object();
    for (int i = 0; i < 257; ++i)
        many[std::to_string(i)] = "v";
    refused("labels", many);
    Facts long_ = someFacts();
    long_.inventory->document = json{{"x", std::string(fleet::kMostFactsBytes, 'x')}}.dump();
    EXPECT_THROW(readBack(signFacts(long_, signer())), MessageError);
}

TEST(HostsFacts, SayTheSameWheneverTheyAreTold) {
    Facts later = someFacts();
    later.time += Moment(1);
    later.inventory->time += Moment(1);
    EXPECT_TRUE(saySame(later, someFacts()));
    later.labels["env"] = "production";
    EXPECT_FALSE(saySame(later, someFacts()));
    later = someFacts();
    later.inventory->document = "{}";
    EXPECT_FALSE(saySame(later, someFacts()));
    later.inventory.reset();
    EXPECT_FALSE(saySame(later, someFacts()));
}

}  // namespace
