// What a guarded host and zavctl see to when files are pushed, each beside what happens unguarded.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <sys/stat.h>
#include <sys/statvfs.h>
#include <unistd.h>

#include <csignal>
#include <filesystem>

#include "ctl/client/canned_host.h"
#include "ctl/client/http/percent_encoding.h"
#include "e2e/transfers/push_fixture.h"

namespace {

using nlohmann::json;
using testing::EndsWith;
using testing::HasSubstr;
using testing::Not;
using testing::StartsWith;
using testing::UnorderedElementsAre;

const std::string kWindowsScript = "#!/bin/sh\r\nexit 0\r\n\x1a";
const std::string kUnixScript = "#!/bin/sh\nexit 0\n";

class GuardedPush : public PushFixture {
protected:
    void startGuarded(const std::string& depot = "depot") {
        start({}, depot, ManagedHost::Guards::On);
    }
    /// Starts zavctl in the background.
    std::unique_ptr<Program> startPush(const std::string& source) const {
        return std::make_unique<Program>(
            std::vector<std::string>{zavctlPath(), "--socket", host_->socket(), "push", source});
    }
    /// Makes the file "huge", a hole that the depot has no room for; its size.
    std::uintmax_t makeHuge() const {
        struct statvfs space {};
        EXPECT_EQ(::statvfs(files_.path("depot").c_str(), &space), 0);
        const std::uintmax_t size =
            std::uintmax_t{space.f_bavail} * space.f_frsize + (std::uintmax_t{64} << 30);
        std::filesystem::resize_file(files_.write("huge", ""), size);
        return size;
    }
    /// A push that goes on until it is interrupted, some of which has arrived.
    std::unique_ptr<Program> startEndless() const {
        std::filesystem::resize_file(files_.write("large", "begin"), std::uintmax_t{8} << 30);
        auto program = startPush(files_.path("large"));
        EXPECT_TRUE(eventually([&] {
            std::error_code missing;
            // More than a batch: then the first one's answer has arrived.
            return std::filesystem::file_size(files_.path("depot/large"), missing) > kBatch &&
                   !missing;
        }));
        return program;
    }
};

// A depot of its own ------------------------------------------------------------------------------

class WithoutADepot : public GuardedPush {
protected:
    void startWithoutDepot(ManagedHost::Guards guards) {
        host_ =
            std::make_unique<ManagedHost>(home_.path(), Environment{{"QVSDEPLOY_AGENTDEPOT", ""}},
                                          std::vector<std::string>{}, guards);
    }
    std::string inHome(const std::string& name) const { return home_.files().read("home/" + name); }
};

TEST_F(WithoutADepot, AGuardedHostMakesOneOfItsOwn) {
    startWithoutDepot(ManagedHost::Guards::On);
    home_.files().write("home/bin/tool", "the home's");
    ASSERT_EQ(push(files_.write("tool", "pushed"), "bin/").status, 0);
    EXPECT_EQ(inHome("bin/tool"), "the home's");
    EXPECT_EQ(inHome("depot/bin/tool"), "pushed");
    EXPECT_EQ(modeOf(home_.path() + "/depot"), 0700U);
    EXPECT_THAT(host_->stop().err,
                HasSubstr("zavhost: QVSDEPLOY_AGENTDEPOT is not set; the depot is " + home_.path() +
                          "/depot\n"));
    host_.reset();
}

TEST_F(WithoutADepot, AnUnguardedHostTakesTheHomeItself) {
    startWithoutDepot(ManagedHost::Guards::Off);
    home_.files().write("home/bin/tool", "the home's");
    ASSERT_EQ(push(files_.write("tool", "pushed"), "bin/").status, 0);
    EXPECT_EQ(inHome("bin/tool"), "pushed");
    EXPECT_FALSE(home_.files().exists("home/depot"));
}

TEST_F(WithoutADepot, NoTransferReachesTheHostsOwnFiles) {
    home_.files().write("home/zavhost/journal", "the host's");
    ASSERT_EQ(::symlink("zavhost", (home_.path() + "/alias").c_str()), 0);
    startWithoutDepot(ManagedHost::Guards::Off);
    for (const char* name : {"zavhost/journal", "alias/journal", "zavhost\\new"}) {
        const ProgramResult result = push(files_.write("file", "pushed"), name);
        EXPECT_EQ(result.status, 1);
        EXPECT_EQ(result.out, std::string(name) + ": the name lies in the host's own files\npush " +
                                  name + ": failed; 1 of 1 not taken\n");
    }
    EXPECT_EQ(inHome("zavhost/journal"), "the host's");
    EXPECT_FALSE(home_.files().exists("home/zavhost/new"));
}

// Names whose files are converted -----------------------------------------------------------------

TEST_F(GuardedPush, AnArchiveThatWouldLoseBytesIsRefusedWithASafeName) {
    startGuarded();
    const std::string archive = std::string("\x1f\x8b\0\r\n\x1a", 6) + randomBytes(1000);
    const std::string file = files_.write("preinstall.sh.tar.gz", archive);
    const ProgramResult result = push(file);
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out,
              "preinstall.sh.tar.gz: it is no text, and the host would drop bytes from it because "
              "of its name\n"
              "  Safe is a name without install.sh, DeployLnk.sh and .mdl, such as "
              "preinstall_sh.tar.gz.\n"
              "push preinstall.sh.tar.gz: refused; nothing was sent\n");
    EXPECT_EQ(pushJson(file)["files"][0]["guard"], "depot-content");
    EXPECT_TRUE(depotFiles().empty());
    EXPECT_EQ(push(file, "preinstall_sh.tar.gz").status, 0);
    EXPECT_TRUE(depot("preinstall_sh.tar.gz") == archive);
}

TEST_F(GuardedPush, AnArchiveLosesBytesUnguarded) {
    start();
    const ProgramResult result =
        push(files_.write("preinstall.sh.tar.gz", std::string("\0\r\x1a\n", 4)));
    EXPECT_EQ(result.status, 0);
    EXPECT_THAT(result.out, StartsWith("push preinstall.sh.tar.gz: done; "));
    EXPECT_EQ(depot("preinstall.sh.tar.gz"), std::string("\0\n", 2));
}

TEST_F(GuardedPush, OneRefusedFileKeepsTheWholeFolderFromBeingSent) {
    startGuarded();
    files_.write("tree/a", "A");
    files_.write("tree/b.mdl", std::string("\0\r", 2));
    EXPECT_EQ(push(files_.path("tree")).status, 1);
    EXPECT_TRUE(depotFiles().empty());
}

TEST_F(GuardedPush, TextPassesWithANoteAndIsVerifiedAsConverted) {
    startGuarded();
    const ProgramResult result = push(files_.write("install.sh", kWindowsScript));
    EXPECT_EQ(result.status, 0) << result.out;
    EXPECT_THAT(result.out, StartsWith("note: install.sh: its line ends change on the host, "
                                       "because of its name\npush install.sh: done; "));
    EXPECT_THAT(result.out,
                EndsWith("\nverified: 1 file, " + std::to_string(kUnixScript.size()) + " bytes\n"));
    EXPECT_EQ(depot("install.sh"), kUnixScript);
}

TEST_F(GuardedPush, BinaryFilesWithoutSuchBytesPass) {
    startGuarded();
    EXPECT_EQ(push(files_.write("a.mdl", std::string("\0\1\2", 3))).status, 0);
    EXPECT_EQ(depot("a.mdl"), std::string("\0\1\2", 3));
}

/// Another file system than that of the home, which every machine has.
class DepotElsewhere : public GuardedPush {
protected:
    DepotElsewhere() : elsewhere_("/dev/shm/zavmgmt-push-" + std::to_string(::getpid())) {
        std::filesystem::create_directories(elsewhere_);
    }
    ~DepotElsewhere() override {
        host_.reset();
        std::filesystem::remove_all(elsewhere_);
    }
    void startElsewhere(ManagedHost::Guards guards) {
        host_ = std::make_unique<ManagedHost>(home_.path(),
                                              Environment{{"QVSDEPLOY_AGENTDEPOT", elsewhere_}},
                                              std::vector<std::string>{}, guards);
    }
    bool hasArrived(const std::string& name) const {
        return std::filesystem::exists(elsewhere_ + "/" + name);
    }
    std::string elsewhere_;
};

TEST_F(DepotElsewhere, TakesNothingThatTheConversionWouldLose) {
    startElsewhere(ManagedHost::Guards::On);
    const std::string file = files_.write("install.sh", kUnixScript);
    const ProgramResult result = push(file);
    EXPECT_EQ(result.status, 1);
    EXPECT_THAT(result.out, HasSubstr("are on different file systems\n"));
    EXPECT_THAT(result.out, EndsWith("push install.sh: refused; nothing was sent\n"));
    EXPECT_EQ(push(file, "setup.sh").status, 0);
    EXPECT_TRUE(hasArrived("setup.sh"));
}

TEST_F(DepotElsewhere, RefusesSuchTransfersOfOtherClientsToo) {
    startElsewhere(ManagedHost::Guards::On);
    // Without the HTTP socket nobody is asked first.
    const std::string file = files_.write("install.sh", kUnixScript);
    const ProgramResult result =
        runProgram({zavctlPath(), "--socket", files_.path("nobody"), "--rpc-socket",
                    host_->socket() + ".rpc", "push", file});
    EXPECT_EQ(result.status, 1);
    EXPECT_THAT(result.out, EndsWith("push install.sh: failed; 1 of 1 not taken\n"));
    EXPECT_FALSE(hasArrived("install.sh"));
}

TEST_F(DepotElsewhere, LosesSuchFilesUnguarded) {
    startElsewhere(ManagedHost::Guards::Off);
    EXPECT_EQ(push(files_.write("install.sh", kUnixScript)).status, 0);
    EXPECT_FALSE(hasArrived("install.sh"));
}

// Arrival -----------------------------------------------------------------------------------------

TEST_F(GuardedPush, AFolderEndsWithCountsOfWhatIsVerified) {
    startGuarded();
    files_.write("tree/a", "A");
    files_.write("tree/b/c", "12345");
    files_.makeDir("tree/hollow");
    ASSERT_EQ(::mkfifo(files_.path("tree/pipe").c_str(), 0600), 0);
    const ProgramResult result = push(files_.path("tree"));
    EXPECT_EQ(result.status, 0) << result.out << result.err;
    EXPECT_THAT(result.out, StartsWith("note: hollow is not pushed: the folder is empty\n"
                                       "note: pipe is not pushed: it is a FIFO\n"
                                       "push 2 files: done; 6 B in "));
    EXPECT_THAT(result.out, EndsWith("\nverified: 2 files, 6 bytes\n"));
    EXPECT_EQ(pushJson(files_.path("tree"))["verified"], true);
}

TEST_F(GuardedPush, ManyFilesAreVerifiedWithFewRequests) {
    startGuarded();
    for (int i = 0; i < 1000; ++i)
        files_.write("many/a folder with blanks/" + std::to_string(i), std::to_string(i));
    EXPECT_THAT(push(files_.path("many")).out, EndsWith("\nverified: 1000 files, 2890 bytes\n"));
}

TEST_F(GuardedPush, ChecksumsArePrintedWhenAskedFor) {
    startGuarded();
    const std::string file = files_.write("file", "abc");
    const std::string sum = "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad";
    EXPECT_THAT(host_->zavctl({"push", "--checksum", file}).out,
                StartsWith(sum + "  file\npush file: done; "));
    EXPECT_EQ(host_->zavctl({"depot", "sum", "file"}).out, sum + "  file\n");
    EXPECT_EQ(pushJson(file)["files"][0]["sha256"], sum);
}

TEST_F(GuardedPush, NobodyVerifiesWhenToldNotTo) {
    startGuarded();
    const ProgramResult result =
        host_->zavctl({"push", "--no-verify", files_.write("file", "abc")});
    EXPECT_EQ(result.status, 0);
    EXPECT_THAT(result.out, Not(HasSubstr("verified")));
}

TEST_F(GuardedPush, NothingIsVerifiedUnguarded) {
    start();
    const ProgramResult result = push(files_.write("file", "abc"));
    EXPECT_EQ(result.status, 0);
    EXPECT_THAT(result.out, Not(HasSubstr("verified")));
    EXPECT_FALSE(pushJson(files_.path("file")).contains("verified"));
}

TEST_F(GuardedPush, ThatCannotBeVerifiedIsNoSuccess) {
    startGuarded();
    const std::string nobody = files_.path("nobody");
    const ProgramResult result =
        runProgram({zavctlPath(), "--socket", nobody, "--rpc-socket", host_->socket() + ".rpc",
                    "push", files_.write("file", "abc")});
    EXPECT_EQ(result.status, 1);
    EXPECT_THAT(result.out, EndsWith("\nnot verified: no host reached at " + nobody +
                                     ": No such file or directory\n"));
    EXPECT_EQ(depot("file"), "abc");
}

TEST_F(GuardedPush, ToAHostThatKnowsNoChecksumsIsASuccessWithANote) {
    startGuarded();
    const ctl_test::CannedHost older([](const ctl_test::CannedHost& self) {
        const ctl_test::Peer peer = self.accept();
        peer.request();
        peer.answer(404, R"({"error": "there is nothing at /v1/depot/check"})");
    });
    const ProgramResult result =
        runProgram({zavctlPath(), "--socket", older.path(), "--rpc-socket",
                    host_->socket() + ".rpc", "push", files_.write("file", "abc")});
    EXPECT_EQ(result.status, 0);
    EXPECT_THAT(result.out, EndsWith("\nnote: not verified: the host cannot compute checksums\n"));
}

// Pushes that break off ---------------------------------------------------------------------------

TEST_F(GuardedPush, AnInterruptedPushRemovesItsPartialFile) {
    startGuarded();
    for (const int signal : {SIGINT, SIGTERM}) {
        const auto program = startEndless();
        program->signal(signal);
        const ProgramResult result = program->wait();
        EXPECT_EQ(result.status, 128 + signal);
        EXPECT_EQ(result.err, "zavctl: interrupted; what had arrived of large is removed\n");
        EXPECT_FALSE(inDepot("large"));
    }
}

TEST_F(GuardedPush, AnInterruptedPushSaysThatTheFormerFileIsGone) {
    files_.write("depot/large", "former");
    startGuarded();
    const auto program = startEndless();
    program->signal(SIGINT);
    EXPECT_EQ(program->wait().err,
              "zavctl: interrupted; what had arrived of large is removed; the file that was there "
              "before is gone\n");
    EXPECT_FALSE(inDepot("large"));
}

TEST_F(GuardedPush, AnInterruptedPushLeavesItsPartialFileUnguarded) {
    start();
    const auto program = startEndless();
    program->signal(SIGINT);
    EXPECT_EQ(program->wait().err, "zavctl: interrupted; large may be in the depot in part\n");
    EXPECT_TRUE(inDepot("large"));
}

TEST_F(GuardedPush, APushWhoseHostGoesAwayNamesItsPartialFile) {
    startGuarded();
    const auto program = startEndless();
    host_->program().signal(SIGKILL);
    host_->program().wait();
    const ProgramResult result = program->wait();
    EXPECT_EQ(result.status, 3);
    EXPECT_THAT(result.err,
                HasSubstr("; large may be in the depot in part, and cannot be removed: "));
    host_->start();
}

// Transfers beside each other ---------------------------------------------------------------------

TEST_F(GuardedPush, AFileThatIsJustBeingSentIsNotSentTwice) {
    startGuarded();
    const auto program = startEndless();
    const std::string other = files_.write("other/large", "another content");
    const ProgramResult second = push(other);
    EXPECT_EQ(second.status, 1);
    EXPECT_EQ(second.out,
              "large: another client is just sending this file\n"
              "  Wait until it has ended, and push again.\n"
              "push large: refused; nothing was sent\n");
    const ProgramResult removal = host_->zavctl({"depot", "rm", "large"});
    EXPECT_EQ(removal.status, 1);
    EXPECT_THAT(removal.err, HasSubstr("a client is just sending large"));
    EXPECT_TRUE(program->running());
    program->signal(SIGINT);
    program->wait();
    EXPECT_EQ(push(other).status, 0) << "once the first is over";
    EXPECT_EQ(depot("large"), "another content");
}

TEST_F(GuardedPush, TransfersMixUnguarded) {
    start();
    const auto program = startEndless();
    EXPECT_EQ(push(files_.write("other/large", "another content")).status, 0);
    EXPECT_TRUE(program->running());
    program->signal(SIGKILL);
    program->wait();
}

TEST_F(GuardedPush, ALargePushIsNotHinderedByItsOwnBatches) {
    startGuarded();
    const std::string content = randomBytes(5 * kBatch + 7);
    EXPECT_EQ(push(files_.write("file", content)).status, 0);
    EXPECT_TRUE(depot("file") == content);
}

// Names and space ---------------------------------------------------------------------------------

TEST_F(GuardedPush, NamesThatAreNoTextAreRefusedBeforeOneOverwritesTheOther) {
    files_.write("tree/name-\xFE", "one");
    files_.write("tree/name-\xFF", "two");
    startGuarded();
    const ProgramResult result = push(files_.path("tree"));
    EXPECT_EQ(result.status, 1);
    EXPECT_THAT(result.out, HasSubstr("the name is no text in the host's code page, UTF-8, and "
                                      "would arrive as another one\n"));
    EXPECT_TRUE(depotFiles().empty());
}

TEST_F(GuardedPush, NamesThatAreNoTextOverwriteEachOtherUnguarded) {
    files_.write("tree/name-\xFE", "one");
    files_.write("tree/name-\xFF", "two");
    start();
    EXPECT_EQ(push(files_.path("tree")).status, 0);
    EXPECT_EQ(depotFiles().size(), 1U);
}

TEST_F(GuardedPush, NamesThatWouldBeCutAreRefusedBeforeOneOverwritesTheOther) {
    files_.write("tree/\u00dcbersicht-M\u00e4rz-1", "one");
    files_.write("tree/\u00dcbersicht-M\u00e4rz-2", "two");
    files_.write("tree/M\u00e4rz", "three");
    startGuarded();
    const ProgramResult result = push(files_.path("tree"));
    EXPECT_EQ(result.status, 1);
    EXPECT_THAT(result.out,
                HasSubstr("the file would arrive under another name: for letters outside ASCII in "
                          "its path the plug-in cuts 1 byte off the end"));
    EXPECT_THAT(result.out + result.err, HasSubstr("a name of ASCII letters is safe"));
    EXPECT_TRUE(depotFiles().empty());
    EXPECT_EQ(push(files_.path("tree/M\u00e4rz")).status, 0);
    EXPECT_EQ(depot("M\u00e4rz"), "three");
}

TEST_F(GuardedPush, NamesThatAreCutOverwriteEachOtherUnguarded) {
    files_.write("tree/\u00dcbersicht-M\u00e4rz-1", "one");
    files_.write("tree/\u00dcbersicht-M\u00e4rz-2", "two");
    start();
    push(files_.path("tree"));
    ASSERT_EQ(depotFiles().size(), 1U);
    EXPECT_THAT(depotFiles().front(), testing::EndsWith("\u00dcbersicht-M\u00e4rz-"));
}

TEST_F(GuardedPush, WhatDoesNotFitIsNotBegun) {
    startGuarded();
    const std::uintmax_t tooMuch = makeHuge();
    const ProgramResult result = push(files_.path("huge"));
    EXPECT_EQ(result.status, 1);
    EXPECT_THAT(result.err, StartsWith("zavctl: the push needs " + std::to_string(tooMuch) +
                                       " bytes, and the depot has room for "));
    EXPECT_TRUE(depotFiles().empty());
}

TEST_F(GuardedPush, WhatDoesNotFitIsBegunUnguarded) {
    makeHuge();
    start();
    const auto program = startPush(files_.path("huge"));
    EXPECT_TRUE(eventually([&] { return inDepot("huge"); }));
    program->signal(SIGKILL);
    program->wait();
}

TEST_F(GuardedPush, NamesThatLeadOutAreSaidToDoSo) {
    startGuarded();
    const ProgramResult result = push(files_.write("file", "x"), "../x");
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out,
              "../x: the name leads out of the depot\npush ../x: refused; nothing was sent\n");
}

/// What is said in words beforehand, and what the transfer then does.
struct Takes {
    bool said;
    bool done;
};

class Names : public GuardedPush {
protected:
    Takes takes(const std::string& name) const {
        const std::string answer =
            host_->exchange("GET /v1/depot/check?path=" + ctl::percentEncoded(name) +
                            " HTTP/1.1\r\nHost: localhost\r\nConnection: close\r\n\r\n");
        const json document = json::parse(answer.substr(answer.find("\r\n\r\n")));
        // Without the HTTP socket nobody is asked first.
        const ProgramResult sent = runProgram({zavctlPath(), "--socket", files_.path("nobody"),
                                               "--rpc-socket", host_->socket() + ".rpc", "push",
                                               "--no-verify", files_.path("file"), name});
        return {document["files"][0]["taken"] == true, sent.status == 0};
    }
    /// A path below the depot of that length together with the depot's, which ends in a slash.
    std::string pathOfLength(std::size_t length) const {
        std::string path;
        while (files_.path("depot").size() + 1 + path.size() < length)
            path += path.size() % 100 == 99 ? '/' : 'n';
        return path;
    }
};

TEST_F(Names, ThatAreThereSayWhatTheirReplacementSetsFree) {
    startGuarded();
    files_.write("depot/sub/a", std::string(8192, 'x'));
    ASSERT_EQ(::symlink("sub/a", files_.path("depot/link").c_str()), 0);
    const std::string answer = host_->exchange(
        "GET /v1/depot/check?path=sub/a&path=sub/none&path=link&path=none/a HTTP/1.1\r\n"
        "Host: localhost\r\nConnection: close\r\n\r\n");
    const json document = json::parse(answer.substr(answer.find("\r\n\r\n")));
    EXPECT_GE(document["replaced_bytes"], 8192);
    EXPECT_LT(document["replaced_bytes"], 65536);
    std::vector<bool> replaces;
    for (const json& file : document["files"])
        replaces.push_back(file["replaces"]);
    EXPECT_EQ(replaces, (std::vector<bool>{true, false, true, false}));
}

TEST_F(Names, AreCheckedByTheRulesOfTheTransfer) {
    files_.write("file", "x");
    files_.makeDir("depot/folder");
    files_.write("depot/plain", "x");
    ASSERT_EQ(::symlink("nowhere", files_.path("depot/dangling").c_str()), 0);
    ASSERT_EQ(::symlink("folder", files_.path("depot/link").c_str()), 0);
    startGuarded();
    for (const std::string& name :
         {std::string("new"), std::string("fresh/a/b"), std::string("plain"),
          std::string("dangling"), std::string("link/a"), std::string("folder\\b"),
          std::string(255, 'n'), pathOfLength(1024), std::string("link")}) {
        const Takes result = takes(name);
        EXPECT_TRUE(result.said) << name;
        EXPECT_TRUE(result.done) << name;
    }
    for (const std::string& name :
         {std::string("folder"), std::string("folder/."), std::string("plain/a"),
          std::string("plain/a/b"), std::string(256, 'n'), std::string(256, 'n') + "/a",
          pathOfLength(1025), std::string("../a")}) {
        const Takes result = takes(name);
        EXPECT_FALSE(result.said) << name;
        EXPECT_FALSE(result.done) << name;
    }
}

TEST_F(Names, ThatATransferCannotTakeAreRefusedInWords) {
    files_.makeDir("depot/folder");
    files_.write("depot/plain", "x");
    startGuarded();
    const std::string file = files_.write("file", "x");
    EXPECT_EQ(push(file, "folder").out,
              "folder: a directory of that name is there\n"
              "  zavctl push FILE folder/ puts the file into it.\n"
              "push folder: refused; nothing was sent\n");
    EXPECT_EQ(push(file, "plain/a").out,
              "plain/a: plain is no directory\npush plain/a: refused; nothing was sent\n");
    EXPECT_THAT(push(file, pathOfLength(1025)).out, HasSubstr("the name is too long: with the "));
}

}  // namespace
