// zavctl push: what arrives in the depot of a real host, under which name, and what is said of it.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <sys/resource.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <csignal>
#include <fstream>
#include <iterator>

#include "e2e/transfers/push_fixture.h"

namespace {

using nlohmann::json;
using testing::HasSubstr;
using testing::UnorderedElementsAre;

class Push : public PushFixture {
protected:
    Push() { start(); }

    void expectRefused(const std::string& destination, int status, const std::string& words) {
        const std::string file = files_.write("refused", "garbage");
        const ProgramResult result = push(file, destination);
        EXPECT_EQ(result.status, 1) << destination;
        EXPECT_EQ(result.out, destination + ": " + words + "\npush " + destination +
                                  ": failed; 1 of 1 not taken\n");
        EXPECT_EQ(result.err, "");
        const json document = pushJson(file, destination);
        ASSERT_TRUE(document.contains("files")) << document;
        const json expected = {{"name", destination},
                               {"bytes", 0},
                               {"status", status},
                               {"fault", 0},
                               {"meaning", words}};
        EXPECT_EQ(document["files"], json::array({expected}));
    }
    /// The host's socket for requests and its ends of connections, accepted or not.
    std::size_t requestSockets() const {
        const std::string path = host_->socket();
        std::ifstream table("/proc/net/unix");
        const std::istream_iterator<std::string> words(table);
        return static_cast<std::size_t>(std::count(words, {}, path));
    }
};

TEST_F(Push, FilesOfEverySizeArriveWhole) {
    for (const std::size_t size :
         {std::size_t{0}, std::size_t{1}, std::size_t{4095}, std::size_t{4096}, std::size_t{4097},
          kBatch - 1, kBatch, kBatch + 1, 3 * kBatch, 3 * kBatch + 4097}) {
        const std::string content = randomBytes(size);
        const ProgramResult result = push(files_.write("file", content));
        EXPECT_EQ(result.status, 0) << result.err;
        EXPECT_THAT(result.out, testing::StartsWith("push file: done; ")) << size;
        EXPECT_EQ(result.err, "");
        EXPECT_TRUE(depot("file") == content) << size << " bytes";
        EXPECT_EQ(modeOf(files_.path("depot/file")), 0770U);
    }
}

TEST_F(Push, AFileThatIsThereIsReplaced) {
    push(files_.write("file", randomBytes(2 * kBatch + 5)));
    EXPECT_EQ(push(files_.write("file", "short")).status, 0);
    EXPECT_EQ(depot("file"), "short");
}

TEST_F(Push, TheDestinationNamesTheFileOrTheFolderAboveIt) {
    const std::string file = files_.write("file", "x");
    for (const char* destination :
         {"", "name", "dir/", "dir/name", "\\back\\slash\\name", "/top"}) {
        EXPECT_EQ(push(file, destination).status, 0) << destination;
    }
    EXPECT_THAT(depotFiles(), UnorderedElementsAre("file", "name", "dir/file", "dir/name",
                                                   "back/slash/name", "top"));
}

TEST_F(Push, AFolderArrivesFileByFileWithItsRelativePaths) {
    files_.write("tree/a", "A");
    files_.write("tree/empty", "");
    files_.write("tree/deep/er/b", std::string(5000, 'b'));
    files_.makeDir("tree/nothing");
    const ProgramResult result = push(files_.path("tree"));
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_THAT(result.out, testing::StartsWith("note: nothing is not pushed: the folder is empty\n"
                                                "push 3 files: done; 5.0 kB in "));
    EXPECT_THAT(depotFiles(), UnorderedElementsAre("tree/a", "tree/empty", "tree/deep/er/b"));
    EXPECT_EQ(depot("tree/deep/er/b"), std::string(5000, 'b'));
}

TEST_F(Push, AFoldersDestinationIsItsNewNameOrTheFolderAboveIt) {
    files_.write("tree/sub/a", "A");
    for (const char* destination : {"name", "above/", "two/levels"}) {
        EXPECT_EQ(push(files_.path("tree") + "/", destination).status, 0) << destination;
    }
    EXPECT_THAT(depotFiles(),
                UnorderedElementsAre("name/sub/a", "above/tree/sub/a", "two/levels/sub/a"));
}

TEST_F(Push, ManySmallFilesArriveWhole) {
    for (int i = 0; i < 500; ++i) {
        files_.write("many/" + std::to_string(i % 7) + "/" + std::to_string(i),
                     randomBytes(static_cast<std::size_t>(i) * 20, static_cast<unsigned>(i)));
    }
    ASSERT_EQ(push(files_.path("many")).status, 0);
    for (int i = 0; i < 500; ++i) {
        EXPECT_TRUE(depot("many/" + std::to_string(i % 7) + "/" + std::to_string(i)) ==
                    randomBytes(static_cast<std::size_t>(i) * 20, static_cast<unsigned>(i)))
            << i;
    }
}

TEST_F(Push, ScriptsAndModelFilesGetThisSystemsLineEnds) {
    std::string lines;
    while (lines.size() <= 2 * kBatch)
        lines += "a line\r\n";
    ASSERT_EQ(push(files_.write("model.mdl", lines)).status, 0);
    std::string expected = lines;
    expected.erase(std::remove(expected.begin(), expected.end(), '\r'), expected.end());
    EXPECT_TRUE(depot("model.mdl") == expected);
    const std::string script = files_.write("install.sh", "#!/bin/sh\r\nexit 0\r\n\x1a");
    ASSERT_EQ(push(script, "\\sub\\install.sh").status, 0);
    EXPECT_EQ(depot("sub/install.sh"), "#!/bin/sh\nexit 0\n");
    EXPECT_EQ(modeOf(files_.path("depot/sub/install.sh")), 0770U);
}

TEST_F(Push, JsonTellsWhatBecameOfEachFile) {
    files_.write("tree/a", "A");
    files_.write("tree/b/c", "12345");
    files_.write("depot/tree/b", "in the way");
    json document = pushJson(files_.path("tree"));
    EXPECT_EQ(document["bytes"], 1) << "what was taken";
    EXPECT_GE(document["seconds"].get<double>(), 0);
    const json a = {
        {"name", "tree/a"}, {"bytes", 1}, {"status", 0}, {"fault", 0}, {"meaning", "done"}};
    const json c = {{"name", "tree/b/c"},
                    {"bytes", 0},
                    {"status", 4},
                    {"fault", 0},
                    {"meaning", "the host could not open the file"}};
    EXPECT_EQ(document["files"], json::array({a, c}));
}

TEST_F(Push, OneFileOfAFolderThatIsNotTakenDoesNotHinderTheOthers) {
    for (const char* name : {"a", "b", "c"})
        files_.write(std::string("tree/") + name, name);
    files_.makeDir("depot/tree/b");
    const ProgramResult result = push(files_.path("tree"));
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out,
              "tree/b: the host could not open the file\npush 3 files: failed; 1 of 3 not taken\n");
    EXPECT_THAT(depotFiles(), UnorderedElementsAre("tree/a", "tree/c"));
}

TEST_F(Push, ANameThatIsTooLongIsStatusThree) {
    expectRefused("sub/" + std::string(1100, 'f'), 3, "the name is too long");
}

TEST_F(Push, AFileThatCannotBeOpenedIsStatusFour) {
    files_.makeDir("depot/taken");
    expectRefused("taken", 4, "the host could not open the file");
}

TEST_F(Push, AFileThatCannotBeWrittenIsStatusFive) {
    // Files of this host must not grow, which is told by an error instead of a signal: who starts
    // ignoring the signal goes on ignoring it.
    auto* const before = std::signal(SIGXFSZ, SIG_IGN);
    host_.reset();
    start();
    std::signal(SIGXFSZ, before);
    const rlimit none{0, 0};
    ASSERT_EQ(::prlimit(host_->pid(), RLIMIT_FSIZE, &none, nullptr), 0);
    expectRefused("file", 5, "the host could not write the file");
}

TEST_F(Push, ADirectoryThatCannotBeMadeIsStatusSix) {
    files_.write("depot/file", "x");
    expectRefused("file/below/x", 6, "file/below is no directory");
}

TEST_F(Push, NothingLeavesTheDepot) {
    for (const char* name : {"../outside", "a/../../outside", "..\\outside"}) {
        expectRefused(name, 6, "the name leads out of the depot");
    }
    files_.makeDir("elsewhere");
    ASSERT_EQ(::symlink("../elsewhere", files_.path("depot/relative").c_str()), 0);
    ASSERT_EQ(::symlink(files_.path("elsewhere").c_str(), files_.path("depot/absolute").c_str()),
              0);
    for (const char* name : {"relative/outside", "absolute/outside", "absolute/made/outside"}) {
        expectRefused(name, 6, "the name leads out of the depot");
    }
    EXPECT_FALSE(files_.exists("elsewhere/outside"));
    EXPECT_FALSE(files_.exists("elsewhere/made"));
    EXPECT_FALSE(files_.exists("outside"));
    EXPECT_FALSE(inDepot("a"));
    EXPECT_THAT(host_->trace(), HasSubstr("Could not create destination directory "));
}

TEST_F(Push, WhatIsNoFileIsWrongUsage) {
    ASSERT_EQ(::mkfifo(files_.path("pipe").c_str(), 0600), 0);
    files_.makeDir("hollow");
    const std::string backslash = files_.write("back\\slash", "x");
    const std::pair<std::string, std::string> cases[] = {
        {files_.path("missing"), "there is no " + files_.path("missing")},
        {files_.path("pipe"), files_.path("pipe") + " is no regular file"},
        {files_.path("hollow"), files_.path("hollow") + " holds no files"},
        {backslash, "a name with a backslash cannot be pushed: back\\slash"},
    };
    for (const auto& [source, words] : cases) {
        const ProgramResult result = push(source);
        EXPECT_EQ(result.status, 2) << source;
        EXPECT_EQ(result.err, "zavctl: " + words + "\n");
        EXPECT_EQ(result.out, "");
    }
    EXPECT_TRUE(depotFiles().empty());
}

TEST_F(Push, ATerminalSeesABarWithBytesRateAndTimeLeft) {
    const std::string file = files_.write("file", randomBytes(3 * kBatch));
    const std::string command = zavctlPath() + " --socket " + host_->socket() + " push " + file;
    const std::size_t before = requestSockets();
    ::kill(host_->pid(), SIGSTOP);
    Program terminal({"/usr/bin/script", "-qec", command, "/dev/null"});
    EXPECT_TRUE(eventually([&] { return requestSockets() > before; })) << "the push has begun";
    // Nothing is drawn in the first tenth of a second. Only time brings that to an end.
    ::usleep(150'000);
    ::kill(host_->pid(), SIGCONT);
    const ProgramResult result = terminal.wait();
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_THAT(result.out, testing::ContainsRegex(
                                "\\[#+ *\\] +[0-9]+ %  [0-9.]+ [kM]B of 3.1 MB  [0-9.]+ [kM]?B/s  "
                                "[0-9]+ s left"));
    EXPECT_THAT(result.out, HasSubstr("push file: done; 3.1 MB in "));
}

class PushWithoutDepot : public PushFixture {};

TEST_F(PushWithoutDepot, IsStatusOne) {
    const std::string file = files_.write("file", "x");
    start({}, "file/below");
    const ProgramResult result = push(file);
    EXPECT_EQ(result.status, 1);
    EXPECT_EQ(result.out,
              "file: the host has no usable depot directory\n"
              "push file: failed; 1 of 1 not taken\n");
    EXPECT_EQ(pushJson(file)["files"][0]["status"], 1);
    EXPECT_THAT(host_->trace(), HasSubstr("No useable Agent Depot dir"));
}

}  // namespace
