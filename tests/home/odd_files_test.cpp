// FIFOs and devices where the programs of a home expect a file: they count as files that cannot be
// read, and nothing waits for them.
#include <gmock/gmock.h>

#include <memory>

#include "home/home_fixture.h"

using ::testing::HasSubstr;
using ::testing::Not;

namespace {

class OddFiles : public PreparedHomeTest {
protected:
    /// Puts a FIFO, to which nobody writes, in place of the file.
    void fifo(const std::string& path) const {
        std::filesystem::remove(path);
        ASSERT_EQ(::mkfifo(path.c_str(), 0666), 0) << path;
    }
    Outcome console(const std::string& command) const {
        return run({inHome("bin/um_console"), "-h", home(), "-c", command}, "",
                   {"KUMP_DPCONSOLE_NOCONFIRM=Y"});
    }
};

TEST_F(OddFiles, ConfigurationIsTakenForMissing) {
    write("config/ux_b.cfg", "");
    fifo(inHome("config/ux_b.cfg"));
    fifo(inHome("config/ux.cfg"));
    EXPECT_EQ(translate({"-g", "b:h:UX", "-pc", "ux"}).status, 22);
    EXPECT_THAT(translate({"-g", "-pc", "ux"}).out, HasSubstr("INTERVAL=5"));
    EXPECT_EQ(translate({"-p", "-pc", "ux"}, "A=1\n").status, 8);
    EXPECT_EQ(agent({"start", "-o", "b", "ux"}).status, 0);
    EXPECT_EQ(agent({"stop", "-o", "b", "ux"}).status, 0);
}

TEST_F(OddFiles, ServersEnvironmentNamesNone) {
    fifo(inHome("config/.ConfigData/kmsenv"));
    EXPECT_EQ(translate({"-setCMS", "ux"}).status, 24);
}

TEST_F(OddFiles, InventoryEntryIsLeftOutAndNamed) {
    fifo(inHome("registry/zzlx8266.ver"));
    const Outcome listed = run({inHome("bin/cinfo"), "-d"});
    EXPECT_EQ(listed.status, 0);
    EXPECT_THAT(listed.out, HasSubstr("\"ux\""));
    EXPECT_THAT(listed.err, HasSubstr("zzlx8266.ver: no file"));
}

TEST_F(OddFiles, PidFileAndLockAreNotWaitedFor) {
    fifo(inHome("run/ux.pid"));
    EXPECT_EQ(agent({"stop", "ux"}).status, 5);
    fifo(inHome("run/.ux.lock"));
    EXPECT_EQ(agent({"start", "ux"}).status, 8);
}

TEST_F(OddFiles, MetafileIsRefused) {
    fifo(inHome("universal/metafiles/f.mdl"));
    for (const char* verb : {"getdptype ", "IMPORT "}) {
        EXPECT_EQ(console(verb + inHome("universal/metafiles/f.mdl")).status, 25);
        EXPECT_EQ(console(std::string(verb) + "/dev/zero").status, 25);
    }
}

TEST_F(OddFiles, MetafileThatBecomesOneWhileItIsReadHangsNobody) {
    const std::string file = inHome("universal/metafiles/f.mdl");
    // The file is replaced between the look at it and its opening.
    for (const char* instead : {"/usr/bin/mkfifo", "/bin/ln -sfT /dev/zero"}) {
        std::filesystem::remove(file);
        write("universal/metafiles/f.mdl", "APPL=A\nDPTYPE=SOCK\n");
        scratch.script("tools/mktemp", "rm -f " + file + "; " + instead + " " + file +
                                           "; exec /usr/bin/mktemp \"$@\"\n");
        const Outcome refused =
            run({inHome("bin/um_console"), "-h", home(), "-c", "getdptype " + file}, "",
                {"PATH=" + scratch.path("tools") + ":/usr/bin:/bin"});
        EXPECT_EQ(refused.status, 23) << instead;
    }
}

TEST_F(OddFiles, BundleThatHoldsOneIsRefused) {
    const std::string bundle = scratch.path("bundle");
    ASSERT_EQ(run({source("bundles/make-bundle"), "ux", bundle}).status, 0);
    const auto install = [&] {
        return run({"/bin/sh", bundle + "/install.sh", "-h", home(), "-a", "lx8266"});
    };
    fifo(bundle + "/files/more");
    EXPECT_EQ(install().status, 28);
    std::filesystem::remove(bundle + "/files/more");
    std::filesystem::create_symlink("/etc/hostname", bundle + "/files/more");
    EXPECT_EQ(install().status, 28);
    std::filesystem::remove(bundle + "/files/more");
    fifo(bundle + "/manifest");
    EXPECT_EQ(install().status, 28);
}

TEST_F(OddFiles, WatchedFileThatBecomesOneDoesNotHoldUpTheAgent) {
    write("config/um.config", "INSTANCE=\nKUM_WORK_PATH='" + inHome("universal/work") +
                                  "'\nKUMA_STARTUP_DP='FILE'\nINTERVAL=1\nSTART_SECONDS=0\n");
    for (const char* name : {"a", "b"}) {
        scratch.write(name, "first\n");
        write("universal/work/imported/" + std::string(name) + ".mdl",
              "APPL=" + std::string(name) + "\nDPTYPE=FILE\nSOURCE=" + scratch.path(name) + "\n");
    }
    fifo(scratch.path("a"));
    ASSERT_EQ(agent({"start", "um"}).status, 0);
    EXPECT_TRUE(
        eventually([&] { return read("data/um/b.csv").find("first") != std::string::npos; }));
    EXPECT_EQ(agent({"stop", "um"}).status, 0);
}

}  // namespace
