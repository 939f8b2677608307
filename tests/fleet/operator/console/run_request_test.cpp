#include "fleet/operator/console/runs/run_request.h"

#include <gtest/gtest.h>

#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "ctl/client/failure.h"
#include "tests/fleet/operator/certified.h"

namespace {

using nlohmann::json;
using Words = std::vector<std::string>;

constexpr const char* kUrl = "https://centre.example:8443";
constexpr const char* kId = "0123456789abcdef0123456789abcdef";

/// How a browser asks for a verb.
json asked(const std::string& verb, const Words& arguments, const json& options = json::object()) {
    return {{"verb", verb}, {"arguments", arguments}, {"options", options}};
}

fleet::RunRequest read(const json& request) {
    return fleet::readRunRequest(request.dump(), kUrl);
}

/// What every run is called with, and then these words.
Words called(const Words& words) {
    Words all = {"zavctl-fleet", std::string("--fleet=") + kUrl, "--json", "--timeout=110"};
    all.insert(all.end(), words.begin(), words.end());
    return all;
}

/// Why a request is refused; "" if it is not.
std::string refusalOf(const json& request) {
    const ctl::Failure failure = operator_test::failureOf([&] { read(request); });
    EXPECT_TRUE(failure.status() == ctl::kWrongUsage || failure.status() == ctl::kSuccess)
        << request;
    return failure.status() == ctl::kSuccess ? "" : failure.what();
}

struct Row {
    json request;
    Words words;
    std::string command;
};

json withInput(json request, const std::string& input) {
    request["input"] = input;
    return request;
}

std::vector<Row> rows() {
    const json on = {{"on", "env=test"}};
    return {
        {asked("start", {"ux"}, on),
         {"start", "--on=env=test", "--no-wait", "--", "ux"},
         "start ux --on env=test"},
        {asked("stop", {"ux"}, {{"on", "*"}, {"target", "db1:myhost:UX"}, {"force", true}}),
         {"stop", "--force", "--on=*", "--target=db1:myhost:UX", "--no-wait", "--", "ux"},
         "stop ux --force --on '*' --target db1:myhost:UX"},
        {asked("restart", {"ux"}, {{"on", "web-*"}, {"dry-run", true}, {"force", false}}),
         {"restart", "--dry-run", "--on=web-*", "--no-wait", "--", "ux"},
         "restart ux --dry-run --on 'web-*'"},
        {asked("install", {"ux", "7.1", "/bin/sh", "|DEPLOYDIR|/install.sh", "-h", "--"}, on),
         {"install", "--on=env=test", "--no-wait", "--", "ux", "7.1", "/bin/sh",
          "|DEPLOYDIR|/install.sh", "-h", "--"},
         "install ux 7.1 --on env=test -- /bin/sh '|DEPLOYDIR|/install.sh' -h --"},
        {asked("uninstall", {"ux"}, on),
         {"uninstall", "--on=env=test", "--no-wait", "--", "ux"},
         "uninstall ux --on env=test"},
        {asked("remove-instance", {"ux", "db1:myhost:UX"}, on),
         {"remove-instance", "--on=env=test", "--no-wait", "--", "ux", "db1:myhost:UX"},
         "remove-instance ux db1:myhost:UX --on env=test"},
        {withInput(asked("config set", {"ux"}, on), "A=1\nB=2\n"),
         {"config", "set", "--on=env=test", "--no-wait", "--", "ux", "-"},
         "config set ux - --on env=test"},
        {asked("config get", {"ux"}, {{"on", "env=test"}, {"diff", true}}),
         {"config", "get", "--diff", "--on=env=test", "--", "ux"},
         "config get ux --diff --on env=test"},
        {asked("agents", {}, {{"on", "env=test"}, {"product", "ux"}}),
         {"agents", "--on=env=test", "--product=ux"},
         "agents --on env=test --product ux"},
        {asked("tasks", {}, {{"on", "env=test"}, {"limit", 5}, {"state", "failed"}}),
         {"tasks", "--limit=5", "--on=env=test", "--state=failed"},
         "tasks --limit 5 --on env=test --state failed"},
        {asked("rollout pause", {kId}),
         {"rollout", "pause", "--", kId},
         std::string("rollout pause ") + kId},
        {asked("rollout resume", {kId}, {{"expires", "2h"}}),
         {"rollout", "resume", "--expires=2h", "--", kId},
         std::string("rollout resume ") + kId + " --expires 2h"},
        {asked("rollout abort", {kId}),
         {"rollout", "abort", "--", kId},
         std::string("rollout abort ") + kId},
        {asked("rollout retry-failed", {kId}, {{"force", true}}),
         {"rollout", "retry-failed", "--force", "--", kId},
         std::string("rollout retry-failed ") + kId + " --force"},
        {asked("hosts label", {"web-1", "env=test", "old-"}),
         {"hosts", "label", "--", "web-1", "env=test", "old-"},
         "hosts label web-1 env=test old-"},
    };
}

TEST(ARunRequest, IsExactlyItsVerbsCommandLine) {
    for (const Row& row : rows()) {
        SCOPED_TRACE(row.request.dump());
        ASSERT_EQ(refusalOf(row.request), "");
        const fleet::RunRequest made = read(row.request);
        EXPECT_EQ(made.words, called(row.words));
        EXPECT_EQ(made.command, std::string("zavctl --fleet ") + kUrl + " " + row.command);
    }
}

TEST(ARunRequest, TakesThePlanOfARollout) {
    const json plan = {{"on", "env=test"}, {"waves", "1,10%,100%"}, {"max-failures", "2%"},
                       {"pause", "60s"},   {"wait", "10m"},         {"parallel", "5"},
                       {"expires", "24h"}, {"instance", "db1"}};
    EXPECT_EQ(read(asked("start", {"ux"}, plan)).words,
              called({"start", "--expires=24h", "--instance=db1", "--max-failures=2%",
                      "--on=env=test", "--parallel=5", "--pause=60s", "--wait=10m",
                      "--waves=1,10%,100%", "--no-wait", "--", "ux"}));
}

TEST(ARunRequest, BeginsARolloutOnlyIfItIsNoDryRun) {
    EXPECT_TRUE(read(asked("start", {"ux"}, {{"on", "*"}})).beginsRollout);
    EXPECT_FALSE(read(asked("start", {"ux"}, {{"on", "*"}, {"dry-run", true}})).beginsRollout);
    EXPECT_FALSE(read(asked("agents", {}, {{"on", "*"}})).beginsRollout);
    EXPECT_FALSE(read(asked("rollout pause", {kId})).beginsRollout);
}

TEST(ARunRequest, GivesAConfigurationAsInputAndNeverAsAWord) {
    const fleet::RunRequest made =
        read(withInput(asked("config set", {"ux"}, {{"on", "*"}}), "PASSWORD=secret\n"));
    EXPECT_EQ(made.input, "PASSWORD=secret\n");
    EXPECT_EQ(read(withInput(asked("config set", {"ux", "-"}, {{"on", "*"}}), "A=1")).words,
              made.words);
    for (const std::string& word : made.words)
        EXPECT_EQ(word.find("secret"), std::string::npos) << word;
    EXPECT_NE(refusalOf(asked("config set", {"ux"}, {{"on", "*"}})), "");
    EXPECT_NE(refusalOf(asked("config set", {"ux", "A=1"}, {{"on", "*"}})), "");
    EXPECT_NE(refusalOf(withInput(asked("config set", {"ux", "A=1"}, {{"on", "*"}}), "A=1")), "");
    EXPECT_NE(refusalOf(withInput(asked("config set", {}, {{"on", "*"}}), "A=1")), "");
    EXPECT_NE(refusalOf(withInput(asked("start", {"ux"}, {{"on", "*"}}), "A=1")), "");
}

TEST(ARunRequest, NamesHostsInAList) {
    json request = asked("start", {"ux"});
    request["hosts"] = {"web-1", "it's"};
    const fleet::RunRequest made = read(request);
    EXPECT_EQ(made.words, called({"start", "--on=@/proc/self/fd/3", "--no-wait", "--", "ux"}));
    EXPECT_EQ(made.hosts, "web-1\nit's\n");
    EXPECT_EQ(made.command, std::string("printf '%s\\n' web-1 'it'\\''s' | zavctl --fleet ") +
                                kUrl + " start ux --on @/dev/stdin");
    for (const json& hosts : {json("web-1"), json({""}), json({"web-1", 7}), json({"a b"}),
                              json({"a#b"}), json({"a\nb"}), json({std::string(257, 'a')}),
                              json(std::vector<std::string>(10'001, "a"))}) {
        request["hosts"] = hosts;
        EXPECT_NE(refusalOf(request), "") << hosts.dump().substr(0, 80);
    }
    request["hosts"] = {"web-1"};
    request["options"] = {{"on", "*"}};
    EXPECT_NE(refusalOf(request), "");
}

TEST(ARunRequest, GivesWordsWithDashesSoThatTheyAreNoOptions) {
    const fleet::RunRequest made =
        read(asked("start", {"--fleet=https://evil.example"}, {{"on", "--help"}}));
    EXPECT_EQ(made.words,
              called({"start", "--on=--help", "--no-wait", "--", "--fleet=https://evil.example"}));
    EXPECT_EQ(made.command, std::string("zavctl --fleet ") + kUrl +
                                " start --on=--help -- --fleet=https://evil.example");
}

TEST(ARunRequest, IsRefusedForOtherVerbs) {
    for (const char* verb :
         {"", "login", "console", "push", "hosts", "hosts retire", "help", "version", "rollout",
          "rollout watch", "config", "ua-config", "start ux", "--help", "start\n", "Start"}) {
        EXPECT_NE(refusalOf(asked(verb, {})), "") << verb;
    }
}

TEST(ARunRequest, IsRefusedForOptionsThatAreNotTheVerbs) {
    const json on = {{"on", "*"}};
    const auto with = [&on](const char* name, const json& value) {
        json options = on;
        options[name] = value;
        return options;
    };
    for (const char* name : {"fleet", "json", "timeout", "no-wait", "transid", "once", "help", "",
                             "-on", "--on", "on=x", "file", "socket", "host-user", "colour"}) {
        EXPECT_NE(refusalOf(asked("start", {"ux"}, with(name, "x"))), "") << name;
        EXPECT_NE(refusalOf(asked("start", {"ux"}, with(name, true))), "") << name;
    }
    EXPECT_NE(refusalOf(withInput(asked("config set", {"ux"}, with("file", "/etc/shadow")), "a")),
              "");
    EXPECT_NE(refusalOf(asked("install", {"ux", "1", "a"}, with("complete", true))), "");
    EXPECT_NE(refusalOf(asked("agents", {}, with("waves", "1"))), "");
    EXPECT_NE(refusalOf(asked("rollout pause", {kId}, on)), "");
    EXPECT_NE(refusalOf(asked("rollout pause", {kId}, {{"expires", "1h"}})), "");
}

TEST(ARunRequest, IsRefusedForValuesThatAreNone) {
    for (const json& value : {json("@/etc/passwd"), json("@/proc/self/fd/3"), json(""), json(7.5),
                              json(true), json(nullptr), json({"a"}), json(-1)}) {
        EXPECT_NE(refusalOf(asked("start", {"ux"}, {{"on", value}})), "") << value;
    }
    EXPECT_NE(refusalOf(asked("start", {"ux"}, {{"on", "*"}, {"dry-run", "yes"}})), "");
    EXPECT_NE(refusalOf(asked("start", {"ux"}, {{"on", "*"}, {"parallel", 0}})), "");
    EXPECT_NE(refusalOf(asked("start", {"ux"}, {{"on", "*"}, {"parallel", "many"}})), "");
}

TEST(ARunRequest, IsRefusedForTextsThatAreNoWords) {
    const std::string null("a\0b", 3);
    for (const std::string& word :
         {std::string(), null, std::string("a\nb"), std::string("a\rb"), std::string("\x1b[1m"),
          std::string("\x7f"), std::string(8 * 1024 + 1, 'a')}) {
        EXPECT_NE(refusalOf(asked("start", {word}, {{"on", "*"}})), "") << word.substr(0, 10);
        EXPECT_NE(refusalOf(asked("start", {"ux"}, {{"on", word}})), "") << word.substr(0, 10);
    }
    EXPECT_NE(refusalOf(asked("hosts label", Words(257, "a=b"))), "");
}

TEST(ARunRequest, IsRefusedForMissingAndSuperfluousArguments) {
    EXPECT_EQ(refusalOf(asked("start", {}, {{"on", "*"}})), "PRODUCT is missing");
    EXPECT_NE(refusalOf(asked("start", {"ux", "uy"}, {{"on", "*"}})), "");
    EXPECT_NE(refusalOf(asked("agents", {"ux"}, {{"on", "*"}})), "");
    EXPECT_NE(refusalOf(asked("agents", {"--version"}, {{"on", "*"}})), "");
    EXPECT_NE(refusalOf(asked("hosts label", {"web-1"})), "");
    EXPECT_EQ(refusalOf(asked("start", {"ux"})), "--on is missing: it says which hosts are meant");
}

TEST(ARunRequest, IsRefusedIfItIsNoRequest) {
    for (const char* body : {"", "7", "[]", "{}", "{\"verb\":7}", "{\"verb\":\"start\"", "\xff"}) {
        EXPECT_THROW(fleet::readRunRequest(body, kUrl), ctl::Failure) << body;
    }
    json request = asked("start", {"ux"}, {{"on", "*"}});
    request["environment"] = {{"LD_PRELOAD", "/tmp/x"}};
    EXPECT_NE(refusalOf(request), "");
    EXPECT_NE(refusalOf({{"verb", "start"}, {"arguments", "ux"}}), "");
    EXPECT_NE(refusalOf({{"verb", "start"}, {"arguments", {7}}}), "");
    EXPECT_NE(refusalOf({{"verb", "start"}, {"options", {"on"}}}), "");
    EXPECT_THROW(fleet::readRunRequest(std::string(5000, '['), kUrl), ctl::Failure);
}

}  // namespace
