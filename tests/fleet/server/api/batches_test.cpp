#include "fleet/server/api/sessions/batches.h"

#include <gtest/gtest.h>

namespace {

using fleet::Batches;
using fleet::BatchesFull;
using fleet::Moment;

constexpr Moment kNow{1'800'000'000'000};

TEST(OrderBatches, HaveTheOrdersThatCame) {
    Batches batches;
    const std::string batch = batches.open("anna", kNow);
    EXPECT_EQ(batches.add("anna", batch, {"one", "two"}, kNow), 2U);
    EXPECT_EQ(batches.add("anna", batch, {"three"}, kNow), 3U);
    EXPECT_EQ(*batches.find("anna", batch, kNow), (Batches::Orders{"one", "two", "three"}));
}

TEST(OrderBatches, BelongToWhoHasOpenedThem) {
    Batches batches;
    const std::string batch = batches.open("anna", kNow);
    EXPECT_EQ(batches.add("bert", batch, {"one"}, kNow), std::nullopt);
    EXPECT_EQ(batches.find("bert", batch, kNow), nullptr);
    EXPECT_NE(batches.find("anna", batch, kNow), nullptr);
}

TEST(OrderBatches, OfOneOperatorAreAFewAtATime) {
    Batches batches;
    const std::string first = batches.open("anna", kNow);
    for (std::size_t i = 1; i < Batches::kMostOfOperator; ++i)
        batches.open("anna", kNow + Moment(1));
    EXPECT_NE(batches.find("anna", first, kNow), nullptr);
    const std::string last = batches.open("anna", kNow + Moment(2));
    EXPECT_EQ(batches.find("anna", first, kNow), nullptr) << "it was used least lately";
    EXPECT_TRUE(batches.find("anna", last, kNow)->empty());
}

TEST(OrderBatches, OneChangeOfAnOperatorIsUnderWayAtATime) {
    Batches batches;
    EXPECT_TRUE(batches.beginChange("anna"));
    EXPECT_FALSE(batches.beginChange("anna"));
    EXPECT_TRUE(batches.beginChange("bert"));
    batches.endChange("anna");
    EXPECT_TRUE(batches.beginChange("anna"));
}

TEST(OrderBatches, AreForgottenWhenNobodyUsesThem) {
    Batches batches;
    const std::string batch = batches.open("anna", kNow);
    const Moment later = kNow + Batches::kUnusedTime;
    EXPECT_NE(batches.find("anna", batch, later), nullptr);
    EXPECT_NE(batches.find("anna", batch, later + Batches::kUnusedTime), nullptr);
    EXPECT_EQ(batches.find("anna", batch, later + 2 * Batches::kUnusedTime + Moment(1)), nullptr);
    const std::string another = batches.open("anna", later);
    batches.forget("bert", another);
    EXPECT_NE(batches.find("anna", another, later), nullptr);
    batches.forget("anna", another);
    EXPECT_EQ(batches.find("anna", another, later), nullptr);
}

TEST(OrderBatches, StayAsTheyWereForWhoReadsThem) {
    Batches batches;
    const std::string batch = batches.open("anna", kNow);
    batches.add("anna", batch, {"one"}, kNow);
    const auto read = batches.find("anna", batch, kNow);
    batches.add("anna", batch, {"two"}, kNow);
    EXPECT_EQ(read->size(), 1U);
    EXPECT_EQ(batches.find("anna", batch, kNow)->size(), 2U);
}

TEST(OrderBatches, TakeNothingBeyondTheirLimits) {
    Batches batches;
    const std::string batch = batches.open("anna", kNow);
    batches.add("anna", batch, {"one"}, kNow);
    EXPECT_THROW(batches.add("anna", batch, Batches::Orders(Batches::kMostOrders, "x"), kNow),
                 BatchesFull);
    const std::string big(Batches::kMostBytes, 'x');
    EXPECT_THROW(batches.add("anna", batch, {big}, kNow), BatchesFull);
    EXPECT_EQ(batches.add("anna", batch, {"two"}, kNow), 2U);
}

TEST(OrderBatches, AreOfSoManyOperatorsAtATime) {
    Batches batches;
    for (std::size_t i = 0; i < Batches::kMostBatches; ++i)
        batches.open("operator " + std::to_string(i), kNow);
    EXPECT_THROW(batches.open("one more", kNow), BatchesFull);
    EXPECT_NO_THROW(batches.open("one more", kNow + Batches::kUnusedTime + Moment(1)));
}

}  // namespace
