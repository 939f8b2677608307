// ctest-label: threaded
// What the host gets from the console and what the browser gets from the host, streams included.
#include "ctl/console/host/host_request.h"

#include <gtest/gtest.h>

#include <atomic>
#include <chrono>
#include <filesystem>
#include <optional>
#include <string>
#include <thread>
#include <utility>

#include "ctl/client/canned_host.h"
#include "ctl/console/served_console.h"
#include "support/host/program.h"
#include "support/scratch_dir.h"

namespace {

using console_test::ServedConsole;
using ctl_test::CannedHost;

/// Large enough for every buffer on the way to be full.
constexpr std::size_t kMuch = std::size_t{32} * 1024 * 1024;

/// The link of a console has been followed.
struct OpenConsole : ServedConsole {
    explicit OpenConsole(const CannedHost& host) : ServedConsole(host.path()) { open(); }
};

TEST(ARequestToTheHost, ArrivesAsItIs) {
    std::string seen;
    CannedHost host([&](CannedHost& self) {
        const auto peer = self.accept();
        seen = peer.request();
        peer.answer(200, "{}");
    });
    {
        OpenConsole served(host);
        RawClient client = served.connect();
        client.send("POST /v1/tasks?a=%20b&c HTTP/1.1\r\nHost: " + served.host() +
                    "\r\nX-Zav-Console: 1\r\n" + served.cookie() +
                    "Content-Type: application/json\r\nAccept: text/plain\r\nX-Other: no\r\n"
                    "Content-Length: 7\r\n\r\n{\"a\":1}");
        EXPECT_EQ(client.readAnswer().status, 200);
    }
    host.join();
    EXPECT_EQ(seen.substr(0, seen.find("\r\n")), "POST /v1/tasks?a=%20b&c HTTP/1.1");
    for (const char* line : {"Host: localhost", "Content-Type: application/json",
                             "Accept: text/plain", "Content-Length: 7"}) {
        EXPECT_NE(seen.find(std::string("\r\n") + line + "\r\n"), std::string::npos) << seen;
    }
    EXPECT_EQ(seen.substr(seen.size() - 7), "{\"a\":1}");
    // What is between the browser and the console is not the host's to know.
    for (const char* secret : {"zav_console", "X-Zav-Console", "X-Other"})
        EXPECT_EQ(seen.find(secret), std::string::npos) << seen;
}

TEST(TheHostsAnswer, ArrivesAsItIs) {
    CannedHost host([](CannedHost& self) {
        const auto peer = self.accept();
        peer.request();
        peer.send(
            "HTTP/1.1 429 Reason\r\nContent-Type: text/plain\r\nRetry-After: 7\r\nAllow: GET\r\n"
            "Set-Cookie: a=b\r\nContent-Security-Policy: none\r\nContent-Length: 5\r\n\r\nwords");
    });
    OpenConsole served(host);
    const auto answer = served.ask(served.get("/v1/tasks", served.cookie()));
    EXPECT_EQ(answer.status, 429);
    EXPECT_EQ(answer.body, "words");
    for (const char* line : {"Content-Type: text/plain", "Retry-After: 7", "Allow: GET"})
        EXPECT_NE(answer.head.find(std::string(line) + "\r\n"), std::string::npos) << answer.head;
    EXPECT_EQ(answer.head.find("Set-Cookie"), std::string::npos) << answer.head;
    EXPECT_NE(answer.head.find("frame-ancestors 'none'"), std::string::npos) << answer.head;
}

/// What the browser gets of an answer of this type and status.
RawClient::Answer passedOn(const std::string& type, unsigned status = 200) {
    CannedHost host([&](CannedHost& self) {
        const auto peer = self.accept();
        peer.request();
        peer.send("HTTP/1.1 " + std::to_string(status) + " X\r\nContent-Type: " + type +
                  "\r\nContent-Length: 2\r\n\r\n{}");
    });
    OpenConsole served(host);
    const RawClient::Answer answer = served.ask(served.get("/v1/health", served.cookie()));
    host.join();
    return answer;
}

TEST(TheHostsAnswer, IsNothingThatABrowserRuns) {
    for (const char* type : {"text/html", "text/javascript", "application/javascript",
                             "image/svg+xml", "application/jsonx", "text/css", ""}) {
        const auto answer = passedOn(type);
        EXPECT_EQ(answer.status, 200) << type;
        EXPECT_NE(answer.head.find("\r\nContent-Type: application/octet-stream\r\n"),
                  std::string::npos)
            << type << "\n"
            << answer.head;
    }
    for (const char* type : {"application/json", "text/plain; version=0.0.4"}) {
        EXPECT_NE(passedOn(type).head.find(std::string("\r\nContent-Type: ") + type + "\r\n"),
                  std::string::npos)
            << type;
    }
}

TEST(TheHostsAnswer, IsNeverTakenForTheConsolesOwn) {
    EXPECT_EQ(passedOn("application/json", 401).status, 502);
    EXPECT_EQ(passedOn("application/json", 103).status, 502);
}

TEST(TheHostsAnswer, TakesLimitedRoomUntilItsBrowserHasIt) {
    CannedHost host([](CannedHost& self) {
        while (true) {
            const auto peer = self.accept();
            const std::string request = peer.request();
            const bool isLong = request.find("/v1/tasks") != std::string::npos;
            peer.answer(200, std::string(isLong ? kMuch : 5, 'x'));
            if (request.find("/v1/ready") != std::string::npos) return;
        }
    });
    console::HostSettings settings = console_test::hostAt(host.path());
    settings.answerRoom = kMuch + 1000;
    ServedConsole served(std::move(settings));
    served.open();
    RawClient slow = served.connect();
    slow.send(served.get("/v1/tasks", served.cookie()));
    slow.readUntil("\r\n\r\n");
    const auto refused = served.ask(served.get("/v1/tasks", served.cookie()));
    EXPECT_EQ(refused.status, 503);
    EXPECT_NE(refused.head.find("Retry-After: 1\r\n"), std::string::npos) << refused.head;
    EXPECT_EQ(served.ask(served.get("/v1/health", served.cookie())).body, "xxxxx");
    slow.close();
    EXPECT_TRUE(eventually(
        [&] { return served.ask(served.get("/v1/tasks", served.cookie())).body.size() == kMuch; }));
    served.ask(served.get("/v1/ready", served.cookie()));
    host.join();
}

TEST(TheHostsAnswer, IsPassedOnWithoutAnyRoomWhenItIsShort) {
    CannedHost host([](CannedHost& self) {
        for (const std::size_t length : {kMuch, std::size_t{5}}) {
            const auto peer = self.accept();
            peer.request();
            peer.answer(200, std::string(length, 'x'));
        }
    });
    console::HostSettings settings = console_test::hostAt(host.path());
    settings.answerRoom = 0;
    ServedConsole served(std::move(settings));
    served.open();
    EXPECT_EQ(served.ask(served.get("/v1/tasks", served.cookie())).status, 503);
    EXPECT_EQ(served.ask(served.get("/v1/tasks", served.cookie())).body, "xxxxx")
        << "what the host has accepted must not be sent again";
    host.join();
}

TEST(TheHostsAnswer, HasNoBodyIfOnlyItsHeadIsAskedFor) {
    CannedHost host([](CannedHost& self) {
        const auto peer = self.accept();
        peer.request();
        peer.send(
            "HTTP/1.1 200 OK\r\nContent-Type: text/event-stream\r\nContent-Length: 5\r\n\r\n");
    });
    OpenConsole served(host);
    RawClient client = served.connect();
    client.send("HEAD /v1/events HTTP/1.1\r\nHost: " + served.host() + "\r\n" + served.cookie() +
                "\r\n");
    EXPECT_EQ(client.readUntil("\r\n\r\n").substr(0, 12), "HTTP/1.1 200");
    client.send(served.get("/", served.cookie()));
    EXPECT_EQ(client.readAnswer().body, "<!doctype html>");
}

TEST(AHostThatBreaksOff, IsAnErrorOfTheHosts) {
    CannedHost host([](CannedHost& self) {
        {
            const auto peer = self.accept();
            peer.request();
        }
        const auto peer = self.accept();
        peer.request();
        peer.send("HTTP/1.1 200 OK\r\nContent-Length: 100\r\n\r\nbeginning");
    });
    OpenConsole served(host);
    EXPECT_EQ(served.ask(served.get("/v1/a", served.cookie())).status, 502);
    EXPECT_EQ(served.ask(served.get("/v1/b", served.cookie())).status, 502);
}

TEST(AHostThatIsSilent, IsNotWaitedForWithoutEnd) {
    std::atomic<bool> isOver{false};
    CannedHost host([&](CannedHost& self) {
        const auto peer = self.accept();
        while (!isOver)
            sleepBriefly();
    });
    {
        console::HostSettings settings = console_test::hostAt(host.path());
        settings.host.timeout = std::chrono::milliseconds(50);
        ServedConsole served(std::move(settings));
        served.open();
        EXPECT_EQ(served.ask(served.get("/v1/health", served.cookie())).status, 504);
    }
    isOver = true;
}

TEST(AStream, IsPassedOnAsItComes) {
    std::string seen;
    std::atomic<bool> hasFirst{false};
    std::atomic<bool> hasSecond{false};
    CannedHost host([&](CannedHost& self) {
        const auto peer = self.accept();
        seen = peer.request();
        peer.send(
            "HTTP/1.1 200 OK\r\nContent-Type: text/event-stream\r\nLast-Event-ID: 16\r\n"
            "Connection: close\r\n\r\nid: 17\ndata: one\n\nid: 18\nda");
        while (!hasFirst)
            sleepBriefly();
        peer.send("ta: two\n");
        peer.send("\n");
        while (!hasSecond)
            sleepBriefly();
    });
    {
        OpenConsole served(host);
        RawClient client = served.connect();
        client.send(
            served.get("/v1/events?table=KAGDYST", served.cookie() + "Last-Event-ID: 15\r\n"));
        const std::string head = client.readUntil("\r\n\r\n");
        EXPECT_NE(head.find("Content-Type: text/event-stream\r\n"), std::string::npos) << head;
        EXPECT_NE(head.find("Last-Event-ID: 16\r\n"), std::string::npos) << head;
        EXPECT_NE(head.find("frame-ancestors 'none'"), std::string::npos) << head;
        EXPECT_EQ(client.readUntil("\n\n"), "id: 17\ndata: one\n\n");
        hasFirst = true;
        EXPECT_EQ(client.readUntil("\n\n"), "id: 18\ndata: two\n\n");
        hasSecond = true;
        EXPECT_TRUE(client.isClosed()) << "the host has gone";
        host.join();
    }
    EXPECT_NE(seen.find("\r\nLast-Event-ID: 15\r\n"), std::string::npos) << seen;
}

TEST(AStream, DoesNotEndInTheMiddleOfAnEvent) {
    CannedHost host([](CannedHost& self) {
        const auto peer = self.accept();
        peer.request();
        peer.beginStream();
        peer.send("data: whole\n\ndata: par");
    });
    OpenConsole served(host);
    RawClient client = served.connect();
    client.send(served.get("/v1/events", served.cookie()));
    client.readUntil("\r\n\r\n");
    EXPECT_EQ(client.readAll(), "data: whole\n\n");
}

TEST(AStream, EndsAtTheHostWhenItsBrowserGoes) {
    std::atomic<bool> isOver{false};
    CannedHost host([&](CannedHost& self) {
        const auto peer = self.accept();
        peer.request();
        peer.beginStream();
        peer.send("data: one\n\n");
        isOver = peer.request().empty();  // returns when the other side closes
    });
    OpenConsole served(host);
    {
        RawClient client = served.connect();
        client.send(served.get("/v1/events", served.cookie()));
        client.readUntil("data: one\n\n");
    }
    host.join();
    EXPECT_TRUE(isOver);
}

TEST(AStream, OfASlowBrowserHoldsBackTheHostAndNobodyElse) {
    std::atomic<std::size_t> sent{0};
    CannedHost host([&](CannedHost& self) {
        const auto slow = self.accept();
        slow.request();
        slow.beginStream();
        std::thread flood([&] {
            const std::string event = "data: " + std::string(1000, 'x') + "\n\n";
            for (; sent < kMuch; sent += event.size())
                slow.send(event);
        });
        const auto other = self.accept();
        other.request();
        other.answer(200, "quick");
        flood.join();
    });
    OpenConsole served(host);
    RawClient slow = served.connect();
    slow.send(served.get("/v1/events", served.cookie()));
    slow.readUntil("data: ");
    // Once the sender stands still, all that may be held is held.
    std::size_t before = 0;
    EXPECT_TRUE(eventually([&] {
        std::this_thread::sleep_for(std::chrono::milliseconds(200));
        return std::exchange(before, sent) == sent;
    }));
    EXPECT_LT(sent, kMuch);
    EXPECT_EQ(served.ask(served.get("/v1/health", served.cookie())).body, "quick");
    slow.close();
    host.join();
}

TEST(AHostThatComesBack, IsAskedAgain) {
    std::optional<CannedHost> host;
    ScratchDir scratch;
    console::HostSettings settings = console_test::hostAt(scratch.path("host.sock"));
    ServedConsole served(std::move(settings));
    served.open();
    EXPECT_EQ(served.ask(served.get("/v1/health", served.cookie())).status, 502);
    host.emplace([](CannedHost& self) {
        const auto peer = self.accept();
        peer.request();
        peer.answer(200, "{\"well\":true}");
    });
    std::filesystem::create_symlink(host->path(), scratch.path("host.sock"));
    EXPECT_EQ(served.ask(served.get("/v1/health", served.cookie())).body, "{\"well\":true}");
}

}  // namespace
