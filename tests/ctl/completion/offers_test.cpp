// ctest-label: threaded
#include "ctl/completion/offers.h"

#include <gmock/gmock.h>

#include "ctl/client/canned_host.h"
#include "ctl/completion/completion.h"
#include "ctl/completion/wanted.h"

namespace {

using ctl::Completion;
using ctl_test::CannedHost;
using testing::ElementsAre;
using testing::IsEmpty;

/// What is offered on a host that gives this answer to one request.
std::vector<std::string> offered(ctl::Wanted wanted, const std::string& answer,
                                 std::string* request = nullptr) {
    CannedHost host([&](const CannedHost& self) {
        const ctl_test::Peer peer = self.accept();
        const std::string asked = peer.request();
        if (request != nullptr) *request = asked;
        peer.answer(200, answer);
    });
    wanted.host = {host.path(), "", std::chrono::seconds(20)};
    std::vector<std::string> words;
    for (const ctl::Candidate& candidate :
         ctl::offersFor(wanted, ctl::deadlineIn(std::chrono::seconds(20))))
        words.push_back(candidate.word + (candidate.help.empty() ? "" : " | " + candidate.help));
    host.join();
    return words;
}

ctl::Wanted valueOf(Completion source, const std::string& typed = "") {
    ctl::Wanted wanted;
    wanted.source = source;
    wanted.typed = typed;
    return wanted;
}

TEST(Offers, AreProductsOnceEach) {
    EXPECT_THAT(offered(valueOf(Completion::Product),
                        R"({"rows": [{"PRODUCT": "ux", "PRODDESC": "Load"},
                                     {"PRODUCT": "ux", "PRODDESC": "Load"},
                                     {"PRODUCT": "um", "PRODDESC": ""}]})"),
                ElementsAre("ux | Load", "um"));
}

TEST(Offers, AreInstancesOfTheProduct) {
    ctl::Wanted wanted = valueOf(Completion::Instance, "d");
    wanted.product = "ux";
    EXPECT_THAT(
        offered(wanted,
                R"({"instances": [{"product": "ux", "target": "db1:h:UX", "state": "running"},
                                  {"product": "ux", "target": "h:UX", "state": "stopped"},
                                  {"product": "um", "target": "d:h:UA", "state": "stopped"}]})"),
        ElementsAre("db1:h:UX | running"));
}

TEST(Offers, AreTheNamesThatUsersGaveTheirTasks) {
    EXPECT_THAT(offered(valueOf(Completion::Transaction),
                        R"({"tasks": [{"transid": "nightly", "id": "j-2", "command": "START",
                               "product": "ux", "state": "done"}], "next": null})"),
                ElementsAre("nightly | START ux, done"));
}

TEST(Offers, AreWhatTheDepotHolds) {
    const char* const listing =
        R"({"entries": [{"name": "7.1", "type": "directory"}, {"name": "notes", "type": "file"}]})";
    std::string request;
    EXPECT_THAT(offered(valueOf(Completion::DepotFile, "ux/"), listing, &request),
                ElementsAre("ux/7.1/", "ux/notes"));
    EXPECT_NE(request.find("path=ux"), std::string::npos) << request;
    ctl::Wanted version = valueOf(Completion::DepotVersion);
    version.product = "ux";
    EXPECT_THAT(offered(version, listing, &request), ElementsAre("7.1"));
    EXPECT_NE(request.find("path=ux"), std::string::npos) << request;
}

TEST(Offers, HoldNothingThatCouldSteerATerminal) {
    EXPECT_THAT(offered(valueOf(Completion::Product),
                        R"({"rows": [{"PRODUCT": "u\u001b[2Jx", "PRODDESC": "Load"},
                                     {"PRODUCT": "a\nb", "PRODDESC": ""},
                                     {"PRODUCT": "", "PRODDESC": ""},
                                     {"PRODUCT": "um", "PRODDESC": "\u0007"}]})"),
                ElementsAre("um"));
}

TEST(Offers, OfAHostThatMakesNoSenseAreNone) {
    for (const char* answer :
         {"[]", "17", "{}", "null", R"({"rows": 1})", R"({"instances": {}})"}) {
        for (const Completion source :
             {Completion::Product, Completion::Instance, Completion::DepotFile})
            EXPECT_THAT(offered(valueOf(source), answer), IsEmpty()) << answer;
    }
}

TEST(Offers, OfNoHostAreNone) {
    EXPECT_EQ(ctl::completionOf({"--socket", "/nowhere/at/all", "start", ""}), "words\n");
}

TEST(Offers, ThatNeedNoHostAreThereWithoutOne) {
    EXPECT_EQ(ctl::completionOf({"--socket", "/nowhere", "tasks", "--state", "do"}),
              "words\ndone\n");
    EXPECT_EQ(ctl::completionOf({"--socket", "/nowhere", "tasks", "--state=r"}),
              "words\n--state=running\n--state=refused\n");
    EXPECT_EQ(ctl::completionOf({"query", "KIN"}), "words\nKINAGT\n");
    EXPECT_EQ(ctl::completionOf({"push", ""}), "files\n");
}

}  // namespace
