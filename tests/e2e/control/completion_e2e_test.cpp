// The completion of command lines in the shells that there are, on a live host.
// ctest-label: threaded

#include <gmock/gmock.h>
#include <unistd.h>

#include <algorithm>
#include <nlohmann/json.hpp>
#include <string>
#include <vector>

#include "support/host/managed_host.h"
#include "support/host/starter_home.h"

namespace {

using testing::HasSubstr;

const std::string kBash = "/bin/bash --norc --noprofile -i";

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
    /// The same, typed anew until all of these texts are shown: the host has two seconds to answer,
    /// and nothing is offered where that is too short.
    std::string typedUntil(const std::vector<std::string>& texts, const std::string& shell,
                           const std::string& lines) const {
        std::string shown;
        eventually([&] {
            shown = typed(shell, lines);
            return std::all_of(texts.begin(), texts.end(), [&shown](const std::string& text) {
                return shown.find(text) != std::string::npos;
            });
        });
        return shown;
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
    const std::string line = "zavctl agents --product u";
    const std::string answer = "Monitoring agent";
    const std::string shown =
        typedUntil({line, answer}, kBash,
                   "source " + script("zavctl.bash") + "\nzavctl agen\t--pro\tu\tx\nexit\n");
    EXPECT_THAT(shown, HasSubstr(line));
    EXPECT_THAT(shown, HasSubstr(answer)) << "and that line was carried out";
}

TEST_F(CompletionInShells, OfBashKnowsInstancesWithTheirColons) {
    const ProgramResult agents = host.zavctl({"--json", "agents"});
    const std::string name = nlohmann::json::parse(agents.out)["instances"][0]["target"];
    const std::string shown =
        typedUntil({"--target " + name}, kBash,
                   "source " + script("zavctl.bash") + "\nzavctl start um --target " +
                       name.substr(0, name.find(':') + 2) + "\t--help\nexit\n");
    EXPECT_THAT(shown, HasSubstr("--target " + name));
}

TEST_F(CompletionInShells, OfBashKnowsTasks) {
    ASSERT_EQ(host.zavctl({"start", "ux", "--transid", "evening-17"}).status, 0);
    const std::string line = "zavctl task show evening-17 --help";
    const std::string answer = "START ux";
    const std::string shown = typedUntil({line, answer}, kBash,
                                         "source " + script("zavctl.bash") +
                                             "\nzavctl task show eve\t--help\nzavctl task "
                                             "show eve\t\nexit\n");
    EXPECT_THAT(shown, HasSubstr(line));
    EXPECT_THAT(shown, HasSubstr(answer)) << "and it was shown";
}

TEST_F(CompletionInShells, OfBashKnowsFilesOfTheDepot) {
    home.files().write("home/depot/tool/1.0/in the box:1.tar", "abc");
    home.files().write("home/depot/other", "");
    ASSERT_EQ(home.files().path("home/depot"), home.path("depot"));
    const std::string line = "zavctl depot sum tool/1.0/in\\ the\\ box:1.tar";
    const std::string sum = "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad";
    const std::string shown =
        typedUntil({line, sum}, kBash,
                   "source " + script("zavctl.bash") + "\nzavctl depot sum to\t1\tin\t\nexit\n");
    EXPECT_THAT(shown, HasSubstr(line));
    EXPECT_THAT(shown, HasSubstr(sum)) << "and its sum was told";
}

TEST_F(CompletionInShells, OfZsh) {
    if (!isThere("zsh")) GTEST_SKIP() << "no zsh";
    const std::string folder = script("").substr(0, script("").size() - 1);
    const std::string shown = typedUntil({"Monitoring agent"}, "/usr/bin/zsh -f -i",
                                         "fpath=(" + folder +
                                             " $fpath); autoload -Uz compinit; compinit -u -D\n"
                                             "zavctl agen\t--pro\tux\nexit\n");
    EXPECT_THAT(shown, HasSubstr("Monitoring agent"));
}

TEST_F(CompletionInShells, OfFish) {
    if (!isThere("fish")) GTEST_SKIP() << "no fish";
    const auto offered = [this](const std::string& line, const std::string& text) {
        return typedUntil({text},
                          "/usr/bin/fish --no-config -c 'source " + script("zavctl.fish") +
                              "; complete -C \"" + line + "\"'",
                          "");
    };
    EXPECT_THAT(offered("zavctl agen", "agents\t"), HasSubstr("agents\t"));
    EXPECT_THAT(offered("zavctl start u", "ux\t"), HasSubstr("ux\t"));
    EXPECT_THAT(offered("zavctl push /etc/host", "/etc/hosts"), HasSubstr("/etc/hosts"));
}

}  // namespace
