#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>

#include "fleet/bus/messages/hello_bytes.h"
#include "fleet/link/program/bus_side.h"

namespace {

using fleet::KeyKind;
using fleet::KeyPair;
using fleet::Outcome;
using nlohmann::json;

class PublishedOutcome : public testing::Test {
protected:
    static Outcome outcome(const json& task) {
        Outcome made;
        made.host = "host";
        made.order = std::string(32, 'a');
        made.journal = "journal";
        made.state = "done";
        made.task = task.dump();
        return made;
    }
    static json taskThatWrote(std::size_t bytes, const std::string& reason = "") {
        return {
            {"id", "7"},
            {"reason", reason},
            {"details", {{"commands", {{{"command", "c"}, {"stdout", std::string(bytes, 'x')}}}}}}};
    }
    /// What arrives, after it has been cut as it must be.
    json arriving(const json& task) const {
        const std::string bytes = publishedOutcome(outcome(task), key);
        EXPECT_LE(bytes.size(), 255U * 1024);
        return json::parse(fleet::readOutcome(bytes, "host", key.publicKey()).task);
    }

    const KeyPair key = KeyPair::make(KeyKind::User);
};

TEST_F(PublishedOutcome, IsWholeWhereTheBusTakesIt) {
    EXPECT_EQ(arriving(taskThatWrote(200 * 1024)), taskThatWrote(200 * 1024));
}

TEST_F(PublishedOutcome, LosesItsOutputsFirst) {
    json expected = taskThatWrote(0, "why");
    expected["details"]["commands"][0].erase("stdout");
    EXPECT_EQ(arriving(taskThatWrote(300 * 1024, "why")), expected);
}

TEST_F(PublishedOutcome, KeepsTheTasksNameInAnyCase) {
    EXPECT_EQ(arriving(taskThatWrote(0, std::string(300 * 1024, 'x'))), json({{"id", "7"}}));
}

TEST_F(PublishedOutcome, OneThatMakesNoSenseIsStillTold) {
    Outcome odd = outcome({});
    odd.task = "{\"a\":\"" + std::string(300 * 1024, 'x') + "\"}";
    EXPECT_EQ(fleet::readOutcome(publishedOutcome(odd, key), "host", key.publicKey()).task, "");
}

}  // namespace
