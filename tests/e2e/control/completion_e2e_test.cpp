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
    ManagedHost host{home.path()};
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
