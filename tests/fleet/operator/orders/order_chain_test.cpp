#include "fleet/operator/orders/order_chain.h"

#include <gtest/gtest.h>

#include <optional>
#include <set>
#include <string>

#include "fleet/bus/messages/order.h"
#include "tests/fleet/operator/certified.h"

namespace {

using fleet::OrderChain;
using operator_test::newUser;

TEST(OrderChain, HasAnotherIdentifierForEachOrder) {
    const fleet::KeyPair key = newUser();
    const fleet::KeyPair other = newUser();
    std::set<std::string> identifiers;
    for (const fleet::KeyPair* const by : {&key, &other}) {
        for (const char* const rollout : {"r1", "r2"}) {
            for (const char* const host : {"a", "b"}) {
                for (std::size_t number = 0; number < 3; ++number)
                    identifiers.insert(OrderChain(*by, rollout, host).identifier(number));
            }
        }
    }
    EXPECT_EQ(identifiers.size(), 24U);
    for (const std::string& identifier : identifiers)
        EXPECT_TRUE(fleet::isOrderId(identifier)) << identifier;
}

TEST(OrderChain, KnowsItsOrdersAgain) {
    const fleet::KeyPair key = newUser();
    const OrderChain chain(key, "r1", "a");
    EXPECT_EQ(OrderChain(key, "r1", "a").numberOf(chain.identifier(0)),
              std::optional<std::size_t>(0));
    EXPECT_EQ(chain.numberOf(chain.identifier(fleet::kMostTries - 1)),
              std::optional<std::size_t>(fleet::kMostTries - 1));
    EXPECT_EQ(chain.numberOf(chain.identifier(fleet::kMostTries)), std::nullopt);
    EXPECT_EQ(OrderChain(key, "r2", "a").numberOf(chain.identifier(0)), std::nullopt);
    EXPECT_EQ(OrderChain(key, "r1", "b").numberOf(chain.identifier(0)), std::nullopt);
    EXPECT_EQ(chain.numberOf(fleet::makeOrderId()), std::nullopt);
}

}  // namespace
