// ctest-label: threaded
// The programs zavctl and zavctl-fleet, with a centre whose answers the tests write.

#include <gtest/gtest.h>
#include <unistd.h>

#include <csignal>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "ctl/client/failure.h"
#include "fleet/bus/messages/document.h"
#include "fleet/bus/messages/login.h"
#include "fleet/bus/messages/order.h"
#include "fleet/operator/identity/operator_files.h"
#include "support/host/program.h"
#include "support/scratch_dir.h"
#include "tests/fleet/https/tls_server.h"
#include "tests/fleet/operator/certified.h"
#include "tests/fleet/operator/rollouts/rollout_documents.h"
#include "tests/fleet/operator/scripted_centre.h"

namespace {

using nlohmann::json;
using operator_test::kHour;
using operator_test::newUser;
using operator_test::ScriptedCentre;

class FleetProgramTest : public testing::Test {
protected:
    FleetProgramTest() {
        fleet::OperatorIdentity identity = root_.certified({"START"}, {"ux"}, "*", now_ + kHour);
        identity.url = centre_.url();
        identity.authority = authority_.certificate();
        fleet::OperatorFiles(scratch_.path("zavctl/fleet")).keep(identity);
        key_ = identity.key.publicKey();
        centre_.answer("POST /v1/sessions", 200, {{"session", "s1"}});
        centre_.answer("GET /v1/hosts?limit=1000&selector=env%3Dtest", 200,
                       {{"hosts", {host("web-1"), host("web-2")}}});
        centre_.answer("POST /v1/batches", 201, {{"batch", "b1"}});
        centre_.answer("POST /v1/batches/b1/orders", 200, {{"orders", 2}});
        centre_.answer("POST /v1/rollouts", 201,
                       operator_test::rolloutIn("running", json::object(), 0, 4));
    }
    static json host(const std::string& name) {
        return {{"host", newUser().publicKey()}, {"name", name}, {"state", "here"}};
    }
    static std::string zavctl() { return ZAV_BUILD_DIR "/bin/zavctl"; }
    Environment environment() const {
        return {{"XDG_CONFIG_HOME", scratch_.path("")}, {"ZAV_FLEET", ""}};
    }
    std::vector<std::string> line(std::vector<std::string> words) const {
        std::vector<std::string> all = {zavctl(), "--fleet", centre_.url()};
        all.insert(all.end(), words.begin(), words.end());
        return all;
    }
    ProgramResult run(const std::vector<std::string>& words) const {
        return runProgram(line(words), "", environment());
    }
    /// The roll-out comes to this end.
    void endWith(const std::string& state, const json& over, unsigned released, unsigned waiting) {
        centre_.answer("GET /v1/rollouts/ID", 200,
                       operator_test::rolloutIn(state, over, released, waiting));
    }

    const ScratchDir scratch_;
    const operator_test::Root root_;
    const fleet::Moment now_ = fleet_test::wallTime();
    const fleet::CertificateAuthority authority_ =
        fleet::CertificateAuthority::make("demo", now_, now_ + kHour);
    ScriptedCentre centre_{authority_.issue({"centre.example", "127.0.0.1"}, now_, now_ + kHour)};
    std::string key_;
};

TEST_F(FleetProgramTest, StartsAnAgentOnAllHostsOfASelector) {
    endWith("running", {{"done", 1}}, 3, 0);
    endWith("finished", {{"done", 4}}, 0, 0);
    const ProgramResult result = run({"--on", "env=test", "--waves", "1,100%", "start", "ux"});
    EXPECT_EQ(result.status, ctl::kSuccess) << result.err;
    EXPECT_NE(result.out.find(": START ux on 4 hosts\n"), std::string::npos) << result.out;
    EXPECT_NE(result.out.find("wave 1 of 1, 1 of 4 over: 1 done; 3 under way\n"), std::string::npos)
        << result.out;
    EXPECT_NE(result.out.find("The roll-out is finished.\n4 of 4 over: 4 done\n"),
              std::string::npos)
        << result.out;
    EXPECT_EQ(result.err.rfind("zavctl: note: your certificate ends in ", 0), 0U) << result.err;
    const auto batches = centre_.bodiesOf("POST /v1/batches/b1/orders");
    ASSERT_EQ(batches.size(), 1U);
    const json batch = json::parse(batches.front());
    for (const json& order : batch["orders"]) {
        const std::string bytes = fleet::bytesOfBase64(order.get<std::string>());
        EXPECT_TRUE(isSignedByOperator(fleet::readOrder(bytes), key_));
    }
    const auto rollouts = centre_.bodiesOf("POST /v1/rollouts");
    ASSERT_EQ(rollouts.size(), 1U);
    EXPECT_EQ(json::parse(rollouts.front())["waves"], "1,100%");
}

TEST_F(FleetProgramTest, TellsFailuresAsTheyComeAndFails) {
    endWith("paused", {{"failed", 1}}, 0, 3);
    centre_.answer("GET /v1/rollouts/ID/failures?limit=1000", 200,
                   {{"hosts", {operator_test::failedPart("web-1", "1")}}});
    const ProgramResult text = run({"--on", "env=test", "start", "ux"});
    EXPECT_EQ(text.status, ctl::kHostReportedFailure);
    EXPECT_NE(text.out.find("web-1: failed, no disk\n"), std::string::npos) << text.out;
    EXPECT_NE(text.out.find("The roll-out is paused.\n"), std::string::npos) << text.out;
    const ProgramResult document = run({"--json", "--on", "env=test", "start", "ux"});
    EXPECT_EQ(document.status, ctl::kHostReportedFailure);
    EXPECT_EQ(json::parse(document.out)["failures"].size(), 1U) << document.out;
}

TEST_F(FleetProgramTest, SendsNothingInADryRun) {
    const ProgramResult result = run({"--dry-run", "--on", "env=test", "start", "ux"});
    EXPECT_EQ(result.status, ctl::kSuccess) << result.err;
    EXPECT_NE(result.out.find("would get START {\"product\":\"ux\"}"), std::string::npos)
        << result.out;
    EXPECT_TRUE(centre_.bodiesOf("POST /v1/batches").empty());
}

TEST_F(FleetProgramTest, LeavesTheRolloutAloneAtCtrlC) {
    endWith("running", json::object(), 1, 3);
    Program program(line({"--on", "env=test", "start", "ux"}), "", environment());
    ASSERT_TRUE(program.awaitOutput("wave 1 of 1", std::chrono::seconds(30))) << program.err();
    program.signal(SIGINT);
    const ProgramResult result = program.wait();
    EXPECT_EQ(result.status, ctl::kInterrupted);
    EXPECT_NE(result.err.find(" goes on\n  zavctl rollout watch "), std::string::npos)
        << result.err;
    EXPECT_TRUE(centre_.bodiesOf("POST /v1/rollouts/ID/abort").empty());
}

TEST_F(FleetProgramTest, GivesUpAtItsTimeOut) {
    endWith("running", json::object(), 1, 3);
    const ProgramResult result = run({"--timeout", "5", "--on", "env=test", "start", "ux"});
    EXPECT_EQ(result.status, ctl::kNoOutcome) << result.err;
    EXPECT_NE(result.err.find("rollout watch"), std::string::npos) << result.err;
}

TEST_F(FleetProgramTest, SaysWhatIsWrongWithTheLine) {
    EXPECT_EQ(run({"start", "ux"}).status, ctl::kWrongUsage);
    EXPECT_EQ(run({"--on", "env in (", "start", "ux"}).status, ctl::kWrongUsage);
    EXPECT_EQ(run({"--on", "env=test", "--expires", "8d", "start", "ux"}).status, ctl::kWrongUsage);
    EXPECT_EQ(run({"rollout", "show", "../hosts"}).status, ctl::kWrongUsage);
    EXPECT_EQ(run({"login", "nonsense"}).status, ctl::kWrongUsage);
    const ProgramResult unknown = run({"--json", "frobnicate"});
    EXPECT_EQ(unknown.status, ctl::kWrongUsage);
    EXPECT_TRUE(json::accept(unknown.out)) << unknown.out;
    const ProgramResult stranger =
        runProgram({zavctl(), "--fleet", "https://127.0.0.1:1", "hosts"}, "", environment());
    EXPECT_EQ(stranger.status, ctl::kWrongUsage);
    EXPECT_EQ(stranger.err,
              "zavctl: you have not logged in at https://127.0.0.1:1\n"
              "  zavctl login INVITATION does; an administrator has the invitation.\n");
}

TEST_F(FleetProgramTest, RefusesWhatTheCertificateDoesNotAllowBeforeItAsksAnybody) {
    const ProgramResult result = run({"--on", "env=test", "stop", "ux"});
    EXPECT_EQ(result.status, ctl::kHostReportedFailure);
    EXPECT_TRUE(centre_.bodiesOf("POST /v1/sessions").empty());
}

TEST_F(FleetProgramTest, FindsItsFleetInTheEnvironment) {
    Environment named = environment();
    named.back().second = centre_.url();
    const ProgramResult result = runProgram({zavctl(), "hosts", "env=test"}, "", named);
    EXPECT_EQ(result.status, ctl::kSuccess) << result.err;
    EXPECT_NE(result.out.find("web-2"), std::string::npos) << result.out;
}

TEST_F(FleetProgramTest, TellsShellsWhatMayStandThere) {
    const auto offered = [this](std::vector<std::string> words) {
        words.insert(words.begin(), {zavctl(), "__complete"});
        return runProgram(words, "", environment()).out;
    };
    const std::string pause = "pause\tLet no more hosts get their orders for now\n";
    EXPECT_EQ(offered({"rollout", "pa"}), "words\n" + pause);
    EXPECT_EQ(offered({"--fleet", centre_.url(), "rollout", "pa"}), "words\n" + pause);
    EXPECT_EQ(offered({"rollo"}),
              "words\nrollout\tLook at roll-outs, stop them, and let them go on\n");
    EXPECT_EQ(offered({"--fl"}), "words\n--fleet\tThe fleet's centre\n");
    EXPECT_NE(offered({"start", "ux", "--on=*", "--wav"}).find("--waves\t"), std::string::npos);
}

/// The shells' own part is the same for one host.
TEST_F(FleetProgramTest, IsCompletedByShells) {
    const std::string folder = ZAV_SOURCE_DIR "/ctl/completion/shell/";
    const auto typed = [this](const std::string& shell, const std::string& lines) {
        Environment named = environment();
        named.insert(named.end(), {{"PATH", ZAV_BUILD_DIR "/bin:/usr/bin:/bin"},
                                   {"TERM", "dumb"},
                                   {"LC_ALL", "C.UTF-8"},
                                   {"HOME", scratch_.path("")}});
        return runProgram({"/usr/bin/script", "-qec", shell, "/dev/null"}, lines, named).out;
    };
    const std::string bash =
        typed("/bin/bash --norc --noprofile -i",
              "source " + folder + "zavctl.bash\nzavctl rollo\tpau\t--he\t\nexit\n");
    EXPECT_NE(bash.find("Let no more hosts get their orders for now.\r\n"), std::string::npos)
        << bash;
    if (::access("/usr/bin/zsh", X_OK) == 0) {
        const std::string zsh =
            typed("/usr/bin/zsh -f -i", "fpath=(" + folder +
                                            " $fpath); autoload -Uz compinit; compinit -u -D\n"
                                            "zavctl rollo\tpau\t--he\t\nexit\n");
        EXPECT_NE(zsh.find("Let no more hosts get their orders for now."), std::string::npos)
            << zsh;
    }
    if (::access("/usr/bin/fish", X_OK) == 0) {
        const std::string fish = typed("/usr/bin/fish --no-config -c 'source " + folder +
                                           "zavctl.fish; complete -C \"zavctl rollout pa\"'",
                                       "");
        EXPECT_NE(fish.find("pause\tLet no more hosts"), std::string::npos) << fish;
    }
}

TEST_F(FleetProgramTest, NamesTheWayWhereAVerbIsForOneHost) {
    const ProgramResult text = run({"--on", "env=test", "query", "KINAGT"});
    EXPECT_EQ(text.status, ctl::kWrongUsage);
    EXPECT_EQ(text.err,
              "zavctl: query is for one host at a time\n"
              "  zavctl agents --on, tasks --on and config get --on tell what the tables hold.\n");
    const ProgramResult document = run({"--json", "depot", "ls"});
    EXPECT_EQ(document.status, ctl::kWrongUsage);
    EXPECT_EQ(json::parse(document.out)["error"], "depot ls is for one host at a time");
    EXPECT_TRUE(centre_.bodiesOf("POST /v1/sessions").empty());
}

TEST_F(FleetProgramTest, TellsThatThereIsNoCentre) {
    fleet::OperatorIdentity identity = root_.certified({"START"}, {"ux"}, "*", now_ + kHour);
    identity.url = "https://127.0.0.1:1";
    identity.authority = authority_.certificate();
    fleet::OperatorFiles(scratch_.path("zavctl/fleet")).keep(identity);
    EXPECT_EQ(runProgram({zavctl(), "--fleet", identity.url, "hosts"}, "", environment()).status,
              ctl::kNoHost);
}

TEST_F(FleetProgramTest, TellsWhyALoginIsRefused) {
    const fleet::Invitation invitation{centre_.url(),
                                       fleet::fingerprintOfCertificate(authority_.certificate()),
                                       "demo", root_.key.publicKey(), fleet::makeJoinToken()};
    centre_.answer("POST /v1/logins", 403, {{"error", "the invitation has ended"}});
    const ProgramResult result =
        runProgram({zavctl(), "login", invitationText(invitation)}, "", environment());
    EXPECT_EQ(result.status, ctl::kHostReportedFailure);
    EXPECT_EQ(result.err, "zavctl: the centre refused the request: the invitation has ended\n");
}

}  // namespace
