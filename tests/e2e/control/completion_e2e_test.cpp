// The completion of command lines in the shells that there are, on a live host.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <unistd.h>

#include <nlohmann/json.hpp>

#include "support/host/managed_host.h"
#include "support/host/starter_home.h"

namespace {

using testing::HasSubstr;

class CompletionInShells : public testing::Test {
protected:
    /// What a terminal shows in which these lines are typed.
    std::string typed(const std::string& shell, const std::string& lines) const {
        const std::string path = zavctlPath();
        const std::string folder = path.substr(0, path.rfind('/'));
        return runProgram({"/usr/bin/script", "-qec", shell, "/dev/null"}, lines,
                          {{"PATH", folder + ":/usr/bin:/bin"},
                           {"ZAV_SOCKET", host.socket()},
                           {"TERM", "dumb"},
                           {"LC_ALL", "C.UTF-8"},
                           {"HOME", home.files().path()}})
            .out;
    }
    static std::string script(const std::string& name) {
        return ZAV_SOURCE_DIR "/ctl/completion/shell/" + name;
    }
    static bool isThere(const std::string& shell) {
        return ::access(("/usr/bin/" + shell).c_str(), X_OK) == 0;
    }

    StarterHome home;
    ManagedHost host{home.path(), home.environment()};
};

TEST_F(CompletionInShells, OfBash) {
    const std::string shown =
        typed("/bin/bash --norc --noprofile -i",
              "source " + script("zavctl.bash") + "\nzavctl agen\t--pro\tu\tx\nexit\n");
    EXPECT_THAT(shown, HasSubstr("zavctl agents --product u"));
    EXPECT_THAT(shown, HasSubstr("Monitoring agent")) << "and that line was carried out";
}

TEST_F(CompletionInShells, OfBashKnowsInstancesWithTheirColons) {
    const ProgramResult agents = host.zavctl({"--json", "agents"});
    const std::string name = nlohmann::json::parse(agents.out)["instances"][0]["target"];
    const std::string shown =
        typed("/bin/bash --norc --noprofile -i",
              "source " + script("zavctl.bash") + "\nzavctl start um --target " +
                  name.substr(0, name.find(':') + 2) + "\t--help\nexit\n");
    EXPECT_THAT(shown, HasSubstr("--target " + name));
}

TEST_F(CompletionInShells, OfBashKnowsTasks) {
    ASSERT_EQ(host.zavctl({"start", "ux", "--transid", "evening-17"}).status, 0);
    const std::string shown =
        typed("/bin/bash --norc --noprofile -i", "source " + script("zavctl.bash") +
                                                     "\nzavctl task show eve\t--help\nzavctl task "
                                                     "show eve\t\nexit\n");
    EXPECT_THAT(shown, HasSubstr("zavctl task show evening-17 --help"));
    EXPECT_THAT(shown, HasSubstr("START ux")) << "and it was shown";
}

TEST_F(CompletionInShells, OfBashKnowsFilesOfTheDepot) {
    home.files().write("home/depot/tool/1.0/in the box:1.tar", "abc");
    home.files().write("home/depot/other", "");
    ASSERT_EQ(home.files().path("home/depot"), home.path("depot"));
    const std::string shown =
        typed("/bin/bash --norc --noprofile -i",
              "source " + script("zavctl.bash") + "\nzavctl depot sum to\t1\tin\t\nexit\n");
    EXPECT_THAT(shown, HasSubstr("zavctl depot sum tool/1.0/in\\ the\\ box:1.tar"));
    EXPECT_THAT(shown,
                HasSubstr("ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad"))
        << "and its sum was told";
}

TEST_F(CompletionInShells, OfZsh) {
    if (!isThere("zsh")) GTEST_SKIP() << "no zsh";
    const std::string folder = script("").substr(0, script("").size() - 1);
    const std::string shown =
        typed("/usr/bin/zsh -f -i", "fpath=(" + folder +
                                        " $fpath); autoload -Uz compinit; compinit -u -D\n"
                                        "zavctl agen\t--pro\tux\nexit\n");
    EXPECT_THAT(shown, HasSubstr("Monitoring agent"));
}

TEST_F(CompletionInShells, OfFish) {
    if (!isThere("fish")) GTEST_SKIP() << "no fish";
    const auto offered = [this](const std::string& line) {
        return typed("/usr/bin/fish --no-config -c 'source " + script("zavctl.fish") +
                         "; complete -C \"" + line + "\"'",
                     "");
    };
    EXPECT_THAT(offered("zavctl agen"), HasSubstr("agents\t"));
    EXPECT_THAT(offered("zavctl start u"), HasSubstr("ux\t"));
    EXPECT_THAT(offered("zavctl push /etc/host"), HasSubstr("/etc/hosts"));
}

}  // namespace
