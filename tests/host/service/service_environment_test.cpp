#include "host/service/service_environment.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstdlib>
#include <map>

#include "host/process/start_error.h"

namespace {

using host::PassedSocket;
using std::chrono::microseconds;

class ServiceVariables : public testing::Test {
protected:
    host::ServiceEnvironment read() const {
        return host::readServiceEnvironment([this](const char* name) {
            const auto found = variables.find(name);
            return found == variables.end() ? nullptr : found->second.c_str();
        });
    }

    std::map<std::string, std::string> variables;
    const std::string self = std::to_string(::getpid());
    const std::string other = std::to_string(::getppid());
};

TEST_F(ServiceVariables, WithoutThemNobodyIsToldAnything) {
    const host::ServiceEnvironment service = read();
    EXPECT_EQ(service.notifySocket, "");
    EXPECT_FALSE(service.watchdog);
    EXPECT_TRUE(service.sockets.empty());
}

TEST_F(ServiceVariables, TheWatchdogIsForTheProcessThatItNames) {
    variables = {{"NOTIFY_SOCKET", "@name"}, {"WATCHDOG_USEC", "30000000"}};
    EXPECT_EQ(read().notifySocket, "@name");
    EXPECT_EQ(read().watchdog, microseconds(30'000'000)) << "nobody is named";
    variables["WATCHDOG_PID"] = self;
    EXPECT_EQ(read().watchdog, microseconds(30'000'000));
    variables["WATCHDOG_PID"] = other;
    EXPECT_FALSE(read().watchdog);
    variables["WATCHDOG_PID"] = self;
    variables["WATCHDOG_USEC"] = "0";
    EXPECT_FALSE(read().watchdog);
}

TEST_F(ServiceVariables, NumbersThatMakeNoSenseAreRefused) {
    for (const char* const text : {"soon", "-1", "1s", "99999999999999999999"}) {
        variables = {{"WATCHDOG_USEC", text}};
        EXPECT_THROW(read(), host::StartError) << text;
        variables = {{"LISTEN_PID", self}, {"LISTEN_FDS", text}};
        EXPECT_THROW(read(), host::StartError) << text;
    }
    variables = {{"LISTEN_PID", self}, {"LISTEN_FDS", "65"}};
    EXPECT_THROW(read(), host::StartError);
}

TEST_F(ServiceVariables, SocketsForAnotherProcessAreLeftAlone) {
    variables = {{"LISTEN_PID", other}, {"LISTEN_FDS", "2"}};
    EXPECT_TRUE(read().sockets.empty());
    variables = {{"LISTEN_FDS", "2"}};
    EXPECT_TRUE(read().sockets.empty());
}

TEST_F(ServiceVariables, AreGoneForChildren) {
    const char* const names[] = {"NOTIFY_SOCKET", "WATCHDOG_USEC", "WATCHDOG_PID",
                                 "LISTEN_FDS",    "LISTEN_PID",    "LISTEN_FDNAMES"};
    for (const char* const name : names)
        ::setenv(name, "1", 1);
    host::forgetServiceEnvironment();
    for (const char* const name : names)
        EXPECT_EQ(std::getenv(name), nullptr) << name;
}

class PassedSockets : public testing::Test {
protected:
    void add(const std::string& name, const std::string& path) {
        sockets.push_back({sys::FileDescriptor(), name, path});
    }
    std::vector<PassedSocket> sockets;
};

TEST_F(PassedSockets, AreKnownByTheirPaths) {
    add("zavhost.socket", "/run/b");
    add("zavhost.socket", "/run/a");
    EXPECT_EQ(host::takeSocket(sockets, "http", "/run/a")->path, "/run/a");
    EXPECT_FALSE(host::takeSocket(sockets, "rpc", "/run/c"));
    EXPECT_EQ(sockets.size(), 1U);
}

TEST_F(PassedSockets, MustNotBeNamedForTheOtherRole) {
    add("rpc", "/run/a");
    EXPECT_THROW(host::takeSocket(sockets, "http", "/run/a"), host::StartError);
    EXPECT_TRUE(host::takeSocket(sockets, "rpc", "/run/a"));
}

TEST_F(PassedSockets, MustAllHaveAPlace) {
    EXPECT_NO_THROW(host::refuseSuperfluous(sockets));
    add("", "/run/a");
    EXPECT_THROW(host::refuseSuperfluous(sockets), host::StartError);
}

}  // namespace
