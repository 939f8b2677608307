#include "fleet/operator/orders/order_batch.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "fleet/bus/messages/document.h"
#include "tests/fleet/operator/certified.h"
#include "tests/fleet/operator/fake_centre.h"

namespace {

using fleet::sendOrders;
using nlohmann::json;

class OrderBatch : public testing::Test {
protected:
    OrderBatch() { centre_.answer("POST /v1/batches", json{{"batch", "b1"}}); }
    void answerTotal(std::size_t orders) {
        centre_.answer("POST /v1/batches/b1/orders", json{{"orders", orders}});
    }

    operator_test::FakeCentre centre_;
};

TEST_F(OrderBatch, SendsOrdersInRequestsOfABoundedLength) {
    const std::vector<std::string> orders(5, std::string(300'000, 'o'));
    for (std::size_t total = 1; total <= 5; ++total)
        answerTotal(total);
    std::vector<std::size_t> seen;
    EXPECT_EQ(sendOrders(centre_, orders, [&](std::size_t sent) { seen.push_back(sent); }), "b1");
    EXPECT_EQ(seen, (std::vector<std::size_t>{1, 2, 3, 4, 5}));
    for (const auto& asked : centre_.asked())
        EXPECT_LE(asked.body.dump().size(), 1024U * 1024U);
}

TEST_F(OrderBatch, SendsManyShortOrdersTogether) {
    std::vector<std::string> orders;
    for (int i = 0; i < 700; ++i)
        orders.push_back(std::string(1'000, 'o') + std::to_string(i));
    answerTotal(381);
    answerTotal(700);
    sendOrders(centre_, orders);
    ASSERT_EQ(centre_.asked().size(), 3U);
    std::vector<std::string> arrived;
    for (std::size_t i = 1; i < 3; ++i) {
        for (const json& text : centre_.asked()[i].body["orders"])
            arrived.push_back(fleet::bytesOfBase64(text.get<std::string>()));
    }
    EXPECT_EQ(arrived, orders);
}

TEST_F(OrderBatch, InsistsThatTheCentreHasAllOfThem) {
    answerTotal(1);
    EXPECT_EQ(operator_test::failureOf([&] {
                  sendOrders(centre_, {"a", "b"});
              }).status(),
              ctl::kNoHost);
}

TEST_F(OrderBatch, NeedsAName) {
    operator_test::FakeCentre centre;
    centre.answer("POST /v1/batches", json::object());
    EXPECT_EQ(operator_test::failureOf([&] { sendOrders(centre, {"a"}); }).status(), ctl::kNoHost);
}

}  // namespace
