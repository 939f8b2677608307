/// A server in this process, on a socket of its own, with a table of the test's.
#pragma once

#include <gtest/gtest.h>

#include <atomic>
#include <filesystem>
#include <future>
#include <memory>
#include <optional>
#include <string>
#include <thread>

#include "host/api/api.h"
#include "host/api/routes.h"
#include "host/api/services.h"
#include "host/made_up_table.h"
#include "host/peers/peer_of.h"
#include "host/process/socket_file.h"
#include "host/raw_client.h"
#include "http/server.h"
#include "support/scratch_dir.h"

/// Holds samples until it is opened; opened at the latest when the test ends.
class OpeningGate {
public:
    ~OpeningGate() { open(); }
    void open() {
        if (!open_) promise_.set_value();
        open_ = true;
    }
    void wait() const { opened_.wait(); }

private:
    std::promise<void> promise_;
    std::shared_future<void> opened_{promise_.get_future()};
    bool open_ = false;
};

class ServerTest : public testing::Test {
protected:
    ServerTest() { table.RegisterWithManager(); }
    ~ServerTest() override { stop(); }

    void start(const http::ServerLimits& limits = {}, const host::AccessGroups& groups = {}) {
        socket.emplace(scratch.path("s"));
        services.emplace(oxa::tables(), host::CodePage("UTF-8"), "/home/of/it",
                         host::RowQueue::Limits{}, true, host::Places{}, journal);
        api.emplace(*services, host::routes());
        server = std::make_unique<http::HttpServer>(socket->listen(), host::doorFor(groups), *api,
                                                    services->counts, limits);
        serving = std::thread([this] {
            server->run();
            ended = true;
        });
    }
    void stop() {
        if (!serving.joinable()) return;
        server->stop();
        serving.join();
        server.reset();
        api.reset();
        services.reset();
    }

    RawClient connect() { return RawClient(scratch.path("s")); }
    /// A client whose subscription is live.
    RawClient subscribe(const std::string& rest = "") {
        RawClient client = connect();
        client.send("GET /v1/events?table=PLAIN" + rest + " HTTP/1.1\r\nHost: x\r\n\r\n");
        EXPECT_EQ(client.readUntil("\r\n\r\n").find("HTTP/1.1 200 OK\r\n"), 0U);
        return client;
    }
    static std::string plainQuery() { return R"({"table":"PLAIN"})"; }
    static std::size_t openDescriptors() {
        std::size_t count = 0;
        for ([[maybe_unused]] const auto& entry :
             std::filesystem::directory_iterator("/proc/self/fd"))
            ++count;
        return count;
    }

    ScratchDir scratch;
    MadeUpTable table{"PLAIN", plainColumns()};
    host::Journal::Settings journal;  ///< in memory unless the test says otherwise
    std::optional<host::SocketFile> socket;
    std::optional<host::Services> services;
    std::optional<host::Api> api;
    std::unique_ptr<http::HttpServer> server;
    std::thread serving;
    std::atomic<bool> ended{false};
};
