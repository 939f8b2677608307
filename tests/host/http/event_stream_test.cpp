// ctest-label: threaded
// Subscriptions, fast and slow readers, readers that vanish.
#include <gtest/gtest.h>

#include <atomic>
#include <vector>

#include "host/server_fixture.h"

namespace {

using std::chrono::milliseconds;

class Events : public ServerTest {
protected:
    std::string subscriptionsInHealth() {
        const std::string body = connect().get("/v1/health").body;
        const std::size_t at = body.find("\"subscriptions\":");
        return at == std::string::npos ? body : body.substr(at + 16, body.find(',', at) - at - 16);
    }
};

TEST_F(Events, ComeAsOneServerSentEventPerRow) {
    start();
    RawClient client = connect();
    client.send("GET /v1/events?table=PLAIN HTTP/1.1\r\nHost: x\r\n\r\n");
    const std::string head = client.readUntil("\r\n\r\n");
    EXPECT_NE(head.find("Content-Type: text/event-stream\r\n"), std::string::npos);
    EXPECT_EQ(table.liveObjects(), 1U) << "the subscription is live when the head has come";
    EXPECT_EQ(table.publish(plainRow("a", 1, "x")), OXA_OK);
    EXPECT_EQ(table.publish(plainRow("b", -2, "line\nend")), OXA_OK);
    EXPECT_EQ(client.readUntil("\n\n"), "data: {\"NAME\":\"a\",\"NUMBER\":1,\"TEXT\":\"x\"}\n\n");
    EXPECT_EQ(client.readUntil("\n\n"),
              "data: {\"NAME\":\"b\",\"NUMBER\":-2,\"TEXT\":\"line\\nend\"}\n\n");
}

TEST_F(Events, AreThoseThatEveryParameterTakes) {
    start();
    RawClient client = subscribe("&NAME=x%20y&NUMBER=2");
    table.publish(plainRow("x", 2, "other name"));
    table.publish(plainRow("x y", 1, "other number"));
    table.publish(plainRow("x y", 2, "this"));
    EXPECT_EQ(client.readUntil("\n\n"),
              "data: {\"NAME\":\"x y\",\"NUMBER\":2,\"TEXT\":\"this\"}\n\n");
}

TEST_F(Events, ReachEverySubscriber) {
    start();
    std::vector<RawClient> clients;
    for (int i = 0; i < 50; ++i)
        clients.push_back(subscribe());
    EXPECT_EQ(subscriptionsInHealth(), "50");
    table.publish(plainRow("all", 1, ""));
    for (RawClient& client : clients)
        EXPECT_NE(client.readUntil("\n\n").find("\"all\""), std::string::npos);
}

TEST_F(Events, StopWithTheClient) {
    start();
    RawClient client = subscribe();
    EXPECT_EQ(subscriptionsInHealth(), "1");
    client.close();
    EXPECT_TRUE(eventually([&] { return table.liveObjects() == 0; }));
    EXPECT_EQ(subscriptionsInHealth(), "0");
    EXPECT_EQ(table.publish(plainRow("nobody", 1, "")), OXA_OK);
}

TEST_F(Events, StopWithAClientThatLeftEverythingUnread) {
    start();
    RawClient client = subscribe();
    client.send(std::string(10'000, 'x'));  // bytes that nobody reads
    for (int i = 0; i < 3000; ++i)
        table.publish(plainRow("row", i, "filling text"));
    client.close();
    EXPECT_TRUE(eventually([&] { return table.liveObjects() == 0; }));
}

TEST_F(Events, StillReachAClientThatHasEndedItsSide) {
    start();
    RawClient client = subscribe();
    client.endSending();
    // The server answers this after it has seen the end of the other client's side.
    EXPECT_EQ(subscriptionsInHealth(), "1");
    EXPECT_EQ(table.liveObjects(), 1U);
    table.publish(plainRow("still", 1, ""));
    EXPECT_NE(client.readUntil("\n\n").find("still"), std::string::npos);
    client.close();
    EXPECT_TRUE(eventually([&] { return table.liveObjects() == 0; }));
}

TEST_F(Events, OfAThousandSubscribersThatComeAndGoLeaveNothingBehind) {
    start();
    { RawClient warm = subscribe(); }
    ASSERT_TRUE(eventually([&] { return table.liveObjects() == 0; }));
    const std::size_t before = openDescriptors();
    for (int i = 0; i < 1000; ++i) {
        RawClient client = connect();
        // Every other one does not even wait for the answer.
        client.send("GET /v1/events?table=PLAIN HTTP/1.1\r\n\r\n");
        if (i % 2 == 0) {
            const std::string head = client.readUntil("\r\n\r\n");
            ASSERT_TRUE(head.find("200") != std::string::npos ||
                        head.find("503") != std::string::npos);
        }
        if (i % 10 == 0) table.publish(plainRow("row", i, ""));
    }
    EXPECT_TRUE(eventually([&] { return table.liveObjects() == 0; }));
    EXPECT_TRUE(eventually([&] { return openDescriptors() == before; }));
    EXPECT_EQ(subscriptionsInHealth(), "0");
}

/// NUMBER of a row's event, or how many an overflow event says were lost, as a negative number.
int numberOf(const std::string& event) {
    const bool lost = event.find("event: overflow\ndata: {\"lost\":") == 0;
    const std::string key = lost ? "\"lost\":" : "\"NUMBER\":";
    const int number = std::stoi(event.substr(event.find(key) + key.size()));
    return lost ? -number : number;
}

TEST_F(Events, ThatASlowReaderMissesAreCountedInTheirPlace) {
    start();
    RawClient slow = subscribe();
    RawClient quick = subscribe("&NAME=mark");
    int published = 0;
    bool overflowed = false;
    for (; published < 100'000 && !overflowed; ++published)
        overflowed = table.publish(plainRow("row", published, "filling text")) == OXA_OVERFLOW;
    ASSERT_TRUE(overflowed);
    for (int i = 0; i < 1000; ++i)
        table.publish(plainRow("row", published++, ""));
    table.publish(plainRow("mark", published++, ""));
    EXPECT_NE(quick.readUntil("\n\n").find("mark"), std::string::npos);

    int position = 0, lost = 0;
    while (position < published) {
        const std::string event = slow.readUntil("\n\n");
        ASSERT_NE(event, "") << "after " << position << " of " << published;
        const int number = numberOf(event);
        if (number < 0) {
            lost -= number;
            position -= number;
        } else {
            ASSERT_EQ(number, position++) << "every row has come or has been counted in its place";
        }
    }
    EXPECT_EQ(position, published);
    EXPECT_GT(lost, 0);
    table.publish(plainRow("row", 77, ""));
    EXPECT_EQ(numberOf(slow.readUntil("\n\n")), 77) << "the stream goes on";
}

TEST_F(Events, AreFollowedByASignOfLifeWhenThereAreNone) {
    http::ServerLimits limits;
    limits.heartbeat = milliseconds(20);
    start(limits);
    RawClient client = subscribe();
    EXPECT_EQ(client.readUntil("\n\n"), ":\n\n");
    EXPECT_EQ(client.readUntil("\n\n"), ":\n\n");
    table.publish(plainRow("row", 1, ""));
    std::string event;
    while (event.empty() || event == ":\n\n")
        event = client.readUntil("\n\n");
    EXPECT_EQ(event.find("data: {\"NAME\":\"row\""), 0U);
}

TEST_F(Events, OfTheOutcomeTableComeThroughOneSubscriptionHoweverManyFollow) {
    MadeUpTable outcomes("KAGDYST", plainColumns());
    outcomes.RegisterWithManager();
    start();
    EXPECT_EQ(outcomes.liveObjects(), 1U);
    std::vector<RawClient> clients;
    for (const char* rest : {"", "&NAME=a", "&NAME=b", "&NUMBER=2&NAME=b%20"}) {
        clients.push_back(connect());
        clients.back().send("GET /v1/events?table=KAGDYST" + std::string(rest) +
                            " HTTP/1.1\r\n\r\n");
        EXPECT_NE(clients.back().readUntil("\r\n\r\n").find("200"), std::string::npos);
    }
    EXPECT_EQ(outcomes.liveObjects(), 1U);
    outcomes.publish(plainRow("a", 1, "first"));
    outcomes.publish(plainRow("b", 2, "second"));
    const std::string journalId = "id: " + services->journal.identity();
    const std::string first =
        journalId + "-1\ndata: {\"NAME\":\"a\",\"NUMBER\":1,\"TEXT\":\"first\"}\n\n";
    const std::string second =
        journalId + "-2\ndata: {\"NAME\":\"b\",\"NUMBER\":2,\"TEXT\":\"second\"}\n\n";
    EXPECT_EQ(clients[0].readUntil("\n\n"), first);
    EXPECT_EQ(clients[0].readUntil("\n\n"), second);
    EXPECT_EQ(clients[1].readUntil("\n\n"), first);
    EXPECT_EQ(clients[2].readUntil("\n\n"), second);
    EXPECT_EQ(clients[3].readUntil("\n\n"), second);
    stop();
    EXPECT_EQ(outcomes.liveObjects(), 0U);
}

TEST_F(Events, NeverWaitForTheirReaders) {
    start();
    std::vector<RawClient> asleep;
    for (int i = 0; i < 100; ++i)
        asleep.push_back(subscribe());
    for (int i = 0; i < 2000; ++i)
        table.publish(plainRow("row", i, "filling text"));
    EXPECT_EQ(connect().get("/v1/health").status, 200);
}

TEST_F(Events, OfManyPublishersAllArrive) {
    start();
    RawClient client = subscribe();
    std::vector<std::thread> publishers;
    for (int t = 0; t < 4; ++t) {
        publishers.emplace_back([&, t] {
            for (int i = 0; i < 50; ++i)
                table.publish(plainRow("row", t * 50 + i, ""));
        });
    }
    std::vector<bool> seen(200, false);
    for (int i = 0; i < 200; ++i) {
        const int number = numberOf(client.readUntil("\n\n"));
        ASSERT_GE(number, 0);
        seen.at(static_cast<std::size_t>(number)) = true;
    }
    for (std::thread& publisher : publishers)
        publisher.join();
    EXPECT_EQ(std::count(seen.begin(), seen.end(), true), 200);
}

}  // namespace
