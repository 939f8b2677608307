// Who may read and write what a used home holds, whatever umask its programs were started with.
#include <gmock/gmock.h>

#include "home/home_fixture.h"

using ::testing::HasSubstr;

namespace {

class Modes : public HomeTest {
protected:
    /// Runs the words with the umask 0.
    static Outcome bare(std::vector<std::string> words, const std::string& input = "") {
        words.insert(words.begin(), {"/bin/sh", "-c", "umask 0; exec \"$@\"", "sh"});
        return run(words, input);
    }
    Outcome bareAgent(std::vector<std::string> words) const {
        words.insert(words.begin(), {inHome("bin/TovrinAgent"), "-h", home()});
        return bare(words);
    }

    /// Makes a home and does everything in it that writes a file, all with the umask 0.
    void use(const std::vector<std::string>& options) {
        std::vector<std::string> words{source("bin/prepare-home"), home(), "--arch", "lx8266"};
        words.insert(words.end(), options.begin(), options.end());
        ASSERT_EQ(bare(words).status, 0);
        const std::string translator = inHome("agtqvs6/lx8266/bin/zav_xa");
        const std::string text = "PASSWORD=secret\nSTART_SECONDS=0\nINTERVAL=1\n";
        ASSERT_EQ(bare({translator, "-p", "-pc", "ux"}, text).status, 0);
        ASSERT_EQ(bare({translator, "-p", "b:h:UX", "-pc", "ux"}, text).status, 0);
        ASSERT_EQ(bare({translator, "-setCMS", "ux"}).status, 0);
        const std::string bundle = scratch.path("bundle");
        ASSERT_EQ(bare({source("bundles/make-bundle"), "um", bundle}).status, 0);
        ASSERT_EQ(bare({inHome("bin/uninstall.sh"), "-i", "um", "lx8266"}).status, 0);
        const Outcome again =
            bare({"/bin/sh", bundle + "/install.sh", "-h", home(), "-a", "lx8266"});
        ASSERT_EQ(again.status, 0) << again.err;
        write("universal/metafiles/f.mdl",
              "APPL=F\nDPTYPE=FILE\nSOURCE=" + scratch.write("watched", "one\n") + "\n");
        ASSERT_EQ(bare({inHome("bin/um_console"), "-h", home(), "-c",
                        "IMPORT " + inHome("universal/metafiles/f.mdl")})
                      .status,
                  0);
        for (const char* product : {"ux", "um"}) {
            ASSERT_EQ(bareAgent({"start", product}).status, 0);
        }
        ASSERT_TRUE(eventually([&] { return exists("data/ux/figures.csv"); }));
        ASSERT_TRUE(eventually([&] { return exists("data/um/F.csv"); }));
        ASSERT_EQ(bareAgent({"stop", "um"}).status, 0);
    }

    /// What is wrong with the modes in the folder, one line per file; `open`: others may enter it.
    std::string complaints(const std::filesystem::path& folder, bool open) const {
        std::string found;
        for (const auto& entry : std::filesystem::directory_iterator(folder)) {
            if (entry.is_symlink()) continue;
            struct stat info {};
            ::lstat(entry.path().c_str(), &info);
            const std::string name = entry.path().lexically_relative(home()).string();
            const mode_t mode = info.st_mode & 07777U;
            // In the folder of members' folders its sticky bit keeps each to its own.
            if ((mode & 022U) != 0 && !(name == "users" && mode == 03770)) {
                found += name + " may be written by others\n";
            }
            const bool program = isProgram(name);
            if (!program && open && (mode & 07U) != 0) found += name + " may be read by others\n";
            if (S_ISDIR(info.st_mode)) {
                found += complaints(entry.path(), open && (mode & 01U) != 0);
            }
        }
        return found;
    }
    /// What everybody may read: programs, and the list of what is installed.
    static bool isProgram(const std::string& name) {
        const std::string top = name.substr(0, name.find('/'));
        return top == "bin" || top == "lib" || top == "registry" || top == "agtqvs6";
    }
    mode_t mode(const std::string& file) const {
        struct stat info {};
        return ::stat(inHome(file).c_str(), &info) == 0 ? info.st_mode & 07777U : 0;
    }
};

TEST_F(Modes, NothingThatMayHoldAPasswordIsForOthersInAUsedHome) {
    use({});
    EXPECT_EQ(complaints(home(), true), "");
    for (const char* file : {"config/ux.cfg", "config/ux_b.cfg", "config/um.config",
                             "config/.ConfigData/kumenv", "run/ux.pid", "logs/ux.log"}) {
        EXPECT_EQ(mode(file), 0600U) << file;
    }
    for (const char* folder : {"config", "depot", "logs", "data", "run", "tmp", "universal"}) {
        EXPECT_EQ(mode(folder), 0700U) << folder;
    }
    EXPECT_EQ(bareAgent({"stop", "ux"}).status, 0);
}

TEST_F(Modes, HomeWithAGroupLetsTheGroupReadTheConfiguration) {
    use({"--run-as-group", std::to_string(::getgid())});
    EXPECT_EQ(complaints(home(), true), "");
    for (const char* file : {"config/ux.cfg", "config/ux_b.cfg", "config/um.config"}) {
        EXPECT_EQ(mode(file), 0640U) << file;
    }
    for (const char* folder : {"config", "run", "universal"}) {
        EXPECT_EQ(mode(folder), 02750U) << folder;
    }
    for (const char* folder : {"depot", "logs", "data", "tmp"}) {
        EXPECT_EQ(mode(folder), 0700U) << folder;
    }
    EXPECT_EQ(bareAgent({"stop", "ux"}).status, 0);
}

TEST_F(Modes, StartOfAMembersAgentWithoutAUmaskLeavesNothingForOthers) {
    if (::getuid() != 0) GTEST_SKIP() << "only root can become another user";
    ::chmod(scratch.path().c_str(), 0755);
    use({"--run-as-group", "64100"});
    EXPECT_EQ(bareAgent({"stop", "ux"}).status, 0);
    const auto member = [&](const char* verb) {
        return bare({"/usr/bin/setpriv", "--reuid=64001", "--regid=64001", "--groups=64100",
                     inHome("bin/TovrinAgent"), "-h", home(), verb, "ux"});
    };
    const Outcome started = member("start");
    ASSERT_EQ(started.status, 0) << started.err;
    EXPECT_TRUE(eventually([&] { return exists("users/64001/data/ux/figures.csv"); }));
    EXPECT_EQ(complaints(home(), true), "");
    EXPECT_EQ(mode("users/64001") & 0777U, 0700U);
    EXPECT_EQ(mode("users/64001/logs/ux.log"), 0600U);
    EXPECT_EQ(member("stop").status, 0);
}

TEST_F(Modes, RewrittenConfigurationKeepsItsModeAndOwner) {
    ASSERT_EQ(prepare().status, 0);
    write("config/ux.cfg", "INSTANCE=\nA=1\n", 0640);
    if (::getuid() == 0) {
        ASSERT_EQ(::chown(inHome("config/ux.cfg").c_str(), 64001, 64100), 0);
    }
    ASSERT_EQ(translate({"-p", "-pc", "ux"}, "A=2\n").status, 0);
    EXPECT_EQ(mode("config/ux.cfg"), 0640U);
    struct stat info {};
    ASSERT_EQ(::stat(inHome("config/ux.cfg").c_str(), &info), 0);
    EXPECT_EQ(info.st_uid, ::getuid() == 0 ? 64001U : ::getuid());
}

}  // namespace
