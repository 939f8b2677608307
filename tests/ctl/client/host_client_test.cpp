// ctest-label: threaded
#include "ctl/client/host_client.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>

#include "ctl/client/canned_host.h"
#include "ctl/client/failure.h"

namespace {

using ctl::HostClient;
using ctl_test::CannedHost;
using ctl_test::Peer;
using nlohmann::json;

ctl::Deadline soon() {
    return ctl::deadlineIn(std::chrono::seconds(20));
}

/// Status and text of the failure that a query ends with when the host does as `part` says.
std::pair<int, std::string> failureOfQuery(const std::function<void(const Peer&)>& part) {
    const CannedHost host([&part](const CannedHost& self) { part(self.accept()); });
    try {
        HostClient(host.path()).query({"KINAGT", {}}, soon());
    } catch (const ctl::Failure& failure) {
        return {failure.status(), failure.what()};
    }
    return {0, ""};
}

std::function<void(const Peer&)> answering(int status, const std::string& body) {
    return [=](const Peer& peer) {
        peer.request();
        peer.answer(status, body);
    };
}

TEST(HostClient, AsksForATableWithItsConditionsAndReturnsTheRows) {
    std::string request;
    CannedHost host([&request](const CannedHost& self) {
        const Peer peer = self.accept();
        request = peer.request();
        peer.answer(200, R"({"table": "KINAGT", "rows": [{"PRODUCT": "ux"}]})");
    });
    const json rows =
        HostClient(host.path()).query({"KINAGT", {{"PRODUCT", "like", "u*"}}}, soon()).rows;
    host.join();
    EXPECT_EQ(rows, (json{{{"PRODUCT", "ux"}}}));
    EXPECT_EQ(request.rfind("POST /v1/query HTTP/1.1\r\n", 0), 0U);
    EXPECT_EQ(json::parse(request.substr(request.find("\r\n\r\n"))),
              (json{{"table", "KINAGT"},
                    {"where", {{{"column", "PRODUCT"}, {"op", "like"}, {"value", "u*"}}}}}));
}

/// The body of the request that a query is.
json bodyOf(const ctl::TableQuery& query) {
    std::string request;
    CannedHost host([&request](const CannedHost& self) {
        const Peer peer = self.accept();
        request = peer.request();
        peer.answer(200, R"({"rows": []})");
    });
    HostClient(host.path()).query(query, soon());
    host.join();
    return json::parse(request.substr(request.find("\r\n\r\n")));
}

TEST(HostClient, ForcesOnlyWhatIsToBeForced) {
    EXPECT_EQ(bodyOf({"KAGREQT", {}, true})["force"], true);
    EXPECT_FALSE(bodyOf({"KAGREQT", {}, false}).contains("force"));
}

TEST(HostClient, GivesWhatStandsBesideTheRows) {
    const CannedHost host([](const CannedHost& self) {
        const Peer peer = self.accept();
        peer.request();
        peer.answer(200, R"({"rows": [], "warnings": [{"exit": 3}], "full": [{"row": 0}]})");
    });
    const ctl::QueryAnswer answer = HostClient(host.path()).query({"KINAGT", {}}, soon());
    EXPECT_EQ(answer.warnings, (json{{{"exit", 3}}}));
    EXPECT_EQ(answer.full, (json{{{"row", 0}}}));
}

TEST(HostClient, TakesNothingThereForNoDocumentAndARefusalForOne) {
    const CannedHost none([](const CannedHost& self) {
        const Peer peer = self.accept();
        peer.request();
        peer.answer(404, R"({"error": "no such task"})");
    });
    EXPECT_EQ(HostClient(none.path()).getIfThere("/v1/tasks/T", soon()), json());
    const CannedHost busy([](const CannedHost& self) {
        const Peer peer = self.accept();
        peer.request();
        peer.answer(503, "{}");
    });
    EXPECT_THROW(HostClient(busy.path()).getIfThere("/v1/tasks/T", soon()), ctl::Failure);
}

TEST(HostClient, GivesAnAnswerAsItCame) {
    std::string request;
    CannedHost host([&request](const CannedHost& self) {
        const Peer peer = self.accept();
        request = peer.request();
        peer.send("HTTP/1.1 429 Too Many\r\nRetry-After: 7\r\nContent-Length: 2\r\n\r\n{}");
    });
    const ctl::Answer answer = HostClient(host.path()).post("/v1/tasks", {{"a", 1}}, soon());
    host.join();
    EXPECT_EQ(answer.status, 429U);
    EXPECT_EQ(answer.retryAfter, std::chrono::seconds(7));
    EXPECT_FALSE(answer.isSuccess());
    EXPECT_THROW(answer.document(), ctl::Failure);
    EXPECT_EQ(request.rfind("POST /v1/tasks HTTP/1.1\r\n", 0), 0U);
    EXPECT_EQ(json::parse(request.substr(request.find("\r\n\r\n"))), (json{{"a", 1}}));
}

TEST(HostClient, TakesOnlySecondsForATimeToAskAgain) {
    for (const char* text : {"", "Sun, 22 Nov 2026 05:00:00 GMT", "-1", "1234567", "1.5"}) {
        const CannedHost host([text](const CannedHost& self) {
            const Peer peer = self.accept();
            peer.request();
            peer.send(std::string("HTTP/1.1 503 X\r\nRetry-After: ") + text +
                      "\r\nContent-Length: 0\r\n\r\n");
        });
        EXPECT_FALSE(HostClient(host.path()).ask("/v1/health", soon()).retryAfter) << text;
    }
}

TEST(HostClient, TellsAHostThatMayHaveBeenAskedFromOneThatWasNot) {
    const CannedHost host([](const CannedHost& self) { self.accept().request(); });
    EXPECT_THROW(HostClient(host.path()).post("/v1/tasks", nullptr, soon()), ctl::BrokenConnection);
    try {
        HostClient("/none").post("/v1/tasks", nullptr, soon());
        FAIL();
    } catch (const ctl::BrokenConnection&) {
        FAIL() << "it was never there";
    } catch (const ctl::Failure& failure) {
        EXPECT_EQ(failure.status(), ctl::kNoHost);
    }
}

TEST(HostClient, DoesNotReadAnAnswerBeyondItsLimits) {
    const std::string deep(200'000, '[');
    EXPECT_EQ(failureOfQuery(answering(200, deep)).second,
              "the host's answer is nested deeper than 100 levels");
    const auto huge = failureOfQuery([](const Peer& peer) {
        peer.request();
        peer.send("HTTP/1.1 200 OK\r\nContent-Length: 67108865\r\n\r\n");
    });
    EXPECT_EQ(huge, std::make_pair(int{ctl::kNoHost},
                                   std::string("the host's answer is larger than 64 MiB")));
    const auto begun = failureOfQuery([](const Peer& peer) {
        peer.request();
        peer.send(
            "HTTP/1.1 409 Conflict\r\nContent-Length: 7770252850764915\r\n\r\n{\"error\": 1}");
    });
    EXPECT_EQ(begun, huge) << "its body begins in the piece of its head";
}

TEST(HostClient, MendsAValueThatIsNoValidUtf8) {
    std::string request;
    CannedHost host([&request](const CannedHost& self) {
        const Peer peer = self.accept();
        request = peer.request();
        peer.answer(200, R"({"rows": []})");
    });
    HostClient(host.path()).query({"KINAGT", {{"PRODUCT", "=", "\xff"}}}, soon());
    host.join();
    EXPECT_NE(request.find("\"\xef\xbf\xbd\""), std::string::npos);
}

TEST(HostClient, TakesAnEarlyRefusalForTheAnswer) {
    EXPECT_EQ(failureOfQuery([](const Peer& peer) { peer.answer(503, R"({"error": "busy"})"); }),
              std::make_pair(int{ctl::kHostReportedFailure},
                             std::string("the host refused the request: busy")));
    EXPECT_EQ(failureOfQuery(answering(400, R"({"error": "no such table"})")).first,
              ctl::kWrongUsage);
}

TEST(HostClient, SaysWhatIsWrongWithAnAnswer) {
    EXPECT_EQ(failureOfQuery(answering(200, "<html>")),
              std::make_pair(int{ctl::kNoHost}, std::string("the host's answer is no JSON")));
    for (const char* body : {"[]", "{}", R"({"rows": 7})"}) {
        EXPECT_EQ(failureOfQuery(answering(200, body)),
                  std::make_pair(int{ctl::kNoHost}, std::string("the host's answer has no rows")));
    }
    const auto broken = failureOfQuery([](const Peer& peer) { peer.request(); });
    EXPECT_EQ(broken.first, ctl::kNoHost);
    EXPECT_NE(broken.second.find(" broke: "), std::string::npos) << broken.second;
}

}  // namespace
