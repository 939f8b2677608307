#include "ctl/verbs/host/whoami.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

namespace {

using ctl::Format;
using ctl::showWhoami;
using nlohmann::json;

json answer(const std::string& access, const std::string& reason) {
    return {{"user", "mary"}, {"uid", 1000}, {"access", access}, {"reason", reason}};
}

TEST(WhoamiVerb, SaysWhatOneMayDoAndWhy) {
    EXPECT_EQ(showWhoami(answer("act", "a member of the group ops"), Format::Text).out,
              "You are mary and may do everything, because you are a member of the group ops.\n");
    EXPECT_EQ(showWhoami(answer("read", "a member of the read-only group staff"), Format::Text).out,
              "You are mary and may only read, because you are a member of the read-only group "
              "staff.\n");
}

TEST(WhoamiVerb, GivesTheHostsOwnAnswerAsJson) {
    EXPECT_EQ(json::parse(showWhoami(answer("act", "root"), Format::Json).out),
              answer("act", "root"));
}

TEST(WhoamiVerb, ShowsControlCharactersEscaped) {
    EXPECT_EQ(showWhoami(answer("act", "\x1b[2J"), Format::Text).out,
              "You are mary and may do everything, because you are \\x1B[2J.\n");
}

TEST(WhoamiVerb, DoesNotBelieveWhatIsNoSuchAnswer) {
    for (const json& document : {json::array(), json::object(), json{{"user", "mary"}},
                                 json{{"user", 1}, {"reason", ""}, {"access", ""}}}) {
        EXPECT_THROW(showWhoami(document, Format::Text), ctl::Failure) << document.dump();
    }
}

}  // namespace
