// The host's description of its interface against what the host really answers.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <unistd.h>

#include <filesystem>

#include "support/host/managed_host.h"
#include "support/host/script_home.h"

namespace {

namespace fs = std::filesystem;

/// A group that every machine has.
constexpr const char* kReaders = "users";

class DescribedInterface : public testing::Test {
protected:
    DescribedInterface() {
        home.products({"ux", "px"}, "exit 0");
        home.agentScript("echo said\necho complained >&2\n[ $product != px ] || until [ -e '" +
                         gate() + "' ]; do sleep 0.02; done");
        home.files().write("depot/ux/7.1/notes", "abc");
        home.files().write(
            "depot/ux/od\xff"
            "d",
            "");
    }
    std::string gate() const { return home.files().path("gate"); }
    static bool isRoot() { return ::geteuid() == 0; }
    static std::vector<std::string> options() {
        std::vector<std::string> words = {"--max-queued", "2"};
        if (isRoot()) words.insert(words.end(), {"--read-only-group", kReaders});
        return words;
    }

    ScriptHome home;
};

TEST_F(DescribedInterface, AnswersAsItsDescriptionSays) {
    const ManagedHost host(home.path(), {{"QVSDEPLOY_AGENTDEPOT", home.depot()}}, options(),
                           ManagedHost::Guards::On);
    // Readers come to the socket through this directory.
    fs::permissions(fs::path(host.socket()).parent_path(), fs::perms(0755));
    std::vector<std::string> walk = {"/usr/bin/python3",
                                     ZAV_SOURCE_DIR "/tests/e2e/host/openapi/walk.py",
                                     host.socket(), home.path(), gate()};
    if (isRoot()) walk.emplace_back(kReaders);
    const ProgramResult result =
        runProgram(walk, "", {{"PYTHONDONTWRITEBYTECODE", "1"}}, std::chrono::minutes(4));
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_THAT(result.out, testing::HasSubstr(" operations"));
}

}  // namespace
