#include "fleet/link/questions/allowed_tasks.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <nlohmann/json.hpp>
#include <string>
#include <utility>
#include <vector>

namespace {

using fleet::Number;
using nlohmann::json;

fleet::Certificate grantFor(std::vector<std::string> products) {
    fleet::Certificate grant;
    grant.commands = {"TASKS"};
    grant.products = std::move(products);
    return grant;
}

/// A host with tasks for these products, the newest first.
class TasksOfAHost : public testing::Test {
protected:
    std::string shown(const fleet::Certificate& grant, Number most) {
        questions_ = 0;
        const json answer = fleet::allowedTasks(
            [this](Number wanted, const std::string& after) { return list(wanted, after); }, most,
            grant);
        std::string products;
        for (const json& task : answer.at("tasks"))
            products += task.value("product", "-") + ' ';
        return products;
    }

    std::vector<std::string> products_ = {"ux", "lz", "ux", "ne", ""};
    std::size_t mostAtOnce_ = 100;
    int questions_ = 0;

private:
    json list(Number wanted, const std::string& after) {
        ++questions_;
        const std::size_t from = after.empty() ? 0 : std::stoul(after);
        const std::size_t count = std::min<std::size_t>(wanted, mostAtOnce_);
        const std::size_t end = std::min(from + count, products_.size());
        json tasks = json::array();
        for (std::size_t i = from; i < end; ++i) {
            json task = {{"command", "START"}};
            if (!products_[i].empty()) task["product"] = products_[i];
            tasks.push_back(std::move(task));
        }
        return {{"tasks", tasks}, {"next", end < products_.size() ? json(end) : json()}};
    }
};

TEST_F(TasksOfAHost, AreShownForTheProductsOfTheCertificate) {
    EXPECT_EQ(shown(grantFor({"ux", "n*"}), 20), "ux ux ne - ");
    EXPECT_EQ(shown(grantFor({}), 20), "- ") << "one that concerns no product";
    EXPECT_EQ(questions_, 1);
}

TEST_F(TasksOfAHost, AreAllShownToWhoMayDoAnything) {
    EXPECT_EQ(shown(grantFor({"*"}), 20), "ux lz ux ne - ");
    EXPECT_EQ(shown(grantFor({"*"}), 2), "ux lz ");
    EXPECT_EQ(questions_, 1);
}

TEST_F(TasksOfAHost, AreFoundBehindThoseForOtherProducts) {
    products_ = {"lz", "lz", "lz", "ux", "lz", "ux", "ux"};
    EXPECT_EQ(shown(grantFor({"ux"}), 2), "ux ux ");
    mostAtOnce_ = 1;
    EXPECT_EQ(shown(grantFor({"ux"}), 9), "ux ux ux ");
    EXPECT_EQ(questions_, 7);
}

TEST_F(TasksOfAHost, AreNotLookedForWithoutEnd) {
    products_.assign(100'000, "lz");
    EXPECT_EQ(shown(grantFor({"ux"}), 5), "");
    EXPECT_LE(questions_, 20);
}

TEST(ListOfTasks, MayBeNone) {
    for (const json& said : {json::object(), json{{"tasks", "none"}}, json{{"tasks", {1, "a"}}}}) {
        const json answer = fleet::allowedTasks([&](Number, const std::string&) { return said; }, 5,
                                                grantFor({"ux"}));
        EXPECT_EQ(answer.at("tasks"), json::array());
    }
}

}  // namespace
