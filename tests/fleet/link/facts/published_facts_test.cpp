#include "fleet/link/facts/published_facts.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>

namespace {

using fleet::Facts;
using fleet::KeyKind;
using fleet::KeyPair;
using nlohmann::json;

class PublishedFacts : public testing::Test {
protected:
    static Facts factsWith(const json& inventory) {
        Facts facts;
        facts.host = "UHOST";
        facts.inventory = fleet::Inventory{fleet::Moment(1), inventory.dump()};
        return facts;
    }
    /// The inventory that a centre reads.
    json published(const json& inventory) {
        const std::string bytes = publishedFacts(factsWith(inventory), key_);
        EXPECT_LE(bytes.size(), fleet::kMostFactsBytes);
        return json::parse(fleet::readFacts(bytes, "UHOST", key_.publicKey()).inventory->document);
    }
    static json products(int count, const std::string& description) {
        json list = json::array();
        for (int i = 0; i < count; ++i)
            list.push_back({{"PRODUCT", "p" + std::to_string(i)}, {"PRODDESC", description}});
        return list;
    }

    const KeyPair key_ = KeyPair::make(KeyKind::User);
};

TEST_F(PublishedFacts, AreWholeWhereThereIsRoom) {
    const json inventory = {{"products", products(10, "words")}, {"warnings", {"w"}}};
    EXPECT_EQ(published(inventory), inventory);
}

TEST_F(PublishedFacts, LeaveDescriptionsOutFirst) {
    const json inventory = published({{"products", products(100, std::string(1000, 'd'))}});
    EXPECT_EQ(inventory.at("products").size(), 100U);
    EXPECT_FALSE(inventory.at("products").at(0).contains("PRODDESC"));
    EXPECT_FALSE(inventory.contains("leftOut"));
}

TEST_F(PublishedFacts, SayHowMuchHadNoRoom) {
    json instances = json::array();
    for (int i = 0; i < 3000; ++i)
        instances.push_back({{"target", "t" + std::to_string(i)}, {"state", "running"}});
    const json inventory = published({{"products", products(4000, "")}, {"instances", instances}});
    const std::size_t left = inventory.at("products").size() + inventory.at("instances").size();
    EXPECT_EQ(inventory.at("leftOut").get<std::size_t>() + left, 7000U);
    EXPECT_GT(left, 0U);
    EXPECT_EQ(inventory.at("products").at(0).at("PRODUCT"), "p0");
}

}  // namespace
