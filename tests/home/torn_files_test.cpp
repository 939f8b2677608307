// Programs of a home that are killed, or whose disk is full, at any moment: a file is the old one
// or the new one, and the same command given again succeeds.
#include <gmock/gmock.h>

#include <algorithm>
#include <chrono>
#include <cstdlib>
#include <functional>
#include <random>

#include "home/home_fixture.h"

using ::testing::AnyOf;
using ::testing::HasSubstr;

namespace {

/// How often each program is interrupted; every step in turn with more rounds than steps.
int rounds() {
    const char* const asked = std::getenv("ZAV_KILL_ROUNDS");
    return asked != nullptr ? std::max(1, std::atoi(asked)) : 10;
}

class TornFiles : public PreparedHomeTest {
protected:
    void SetUp() override {
        PreparedHomeTest::SetUp();
        // In the place of each utility: counts the call, and at the chosen one kills the program
        // and all its children, or fails.
        for (const char* tool :
             {"awk",       "cat",   "chmod",  "chown", "cp",   "cut",  "dd",    "dirname",
              "find",      "flock", "head",   "mkdir", "mv",   "rm",   "rmdir", "sed",
              "sha256sum", "sort",  "mktemp", "stat",  "sync", "tail", "tr",    "uname"}) {
            scratch.script("tools/" + std::string(tool),
                           "echo >>$COUNT\n"
                           "if [ \"$(/usr/bin/stat -c %s $COUNT)\" = \"$AT\" ]; then\n"
                           "    [ $HOW = fail ] && exit 1\n"
                           "    kill -KILL 0\n"
                           "fi\n"
                           "exec /usr/bin/" +
                               std::string(tool) + " \"$@\"\n");
        }
    }

    /// Runs the words with the interruption `how` at that call of a utility; 0 is never.
    Outcome interrupted(const std::vector<std::string>& words, const std::string& input,
                        const std::string& how, int at) {
        scratch.write("count", "");
        std::vector<std::string> all{"/usr/bin/setsid", "-w"};
        all.insert(all.end(), words.begin(), words.end());
        return run(all, input,
                   {"PATH=" + scratch.path("tools") + ":/usr/bin:/bin",
                    "COUNT=" + scratch.path("count"), "HOW=" + how, "AT=" + std::to_string(at)});
    }
    int calls() const { return static_cast<int>(scratch.read("count").size()); }

    struct Job {
        std::function<void()> before;  ///< sets the old state up
        std::vector<std::string> words;
        std::string input;
        std::function<void(int)> after;  ///< checks the state; gets the status
        std::function<void()> repeated;  ///< checks the state after the command was given again
    };

    void tryOnce(const Job& job, const std::function<Outcome()>& attempt) {
        job.before();
        job.after(attempt().status);
        if (HasFailure()) return;
        const Outcome again = run(job.words, job.input);
        EXPECT_EQ(again.status, 0) << again.err;
        job.repeated();
    }

    void killAndFailEverywhere(const Job& job) {
        job.before();
        ASSERT_EQ(interrupted(job.words, job.input, "kill", 0).status, 0);
        const int steps = calls();
        ASSERT_GT(steps, 3);
        const int tries = std::min(rounds(), steps);
        for (const char* how : {"kill", "fail"}) {
            for (int i = 0; i < tries && !HasFailure(); ++i) {
                const int at = 1 + i * steps / tries;
                SCOPED_TRACE(std::string(how) + " at call " + std::to_string(at));
                tryOnce(job, [&] { return interrupted(job.words, job.input, how, at); });
            }
        }
        for (int i = 0; i < rounds() && !HasFailure(); ++i) {
            SCOPED_TRACE("killed after a while, round " + std::to_string(i));
            tryOnce(job, [&] { return killedAfterAWhile(job); });
        }
    }

    /// Kills the program and its children at a random moment of its usual running time.
    Outcome killedAfterAWhile(const Job& job) {
        std::vector<std::string> words{"/usr/bin/setsid", "-w"};
        words.insert(words.end(), job.words.begin(), job.words.end());
        Program program(words, job.input);
        const auto end =
            std::chrono::steady_clock::now() +
            std::chrono::microseconds(std::uniform_int_distribution<>(0, 150000)(random_));
        while (std::chrono::steady_clock::now() < end && program.running()) {
        }
        ::kill(-program.pid(), SIGKILL);
        return program.wait();
    }

    std::string leftIn(const std::string& folder) const {
        return run({"/bin/sh", "-c", "cd " + inHome(folder) + " && ls -A | grep '^[.].*[.]'"}).out;
    }

    std::mt19937 random_{20261122};
};

TEST_F(TornFiles, ConfigurationIsTheOldOrTheNewOne) {
    const std::string before = "INSTANCE=\nA=" + std::string(20000, '1') + "\n";
    const std::string after = "INSTANCE=\nA=" + std::string(30000, '2') + "\n";
    killAndFailEverywhere({[&] { write("config/ux.cfg", before, 0600); },
                           {inHome("agtqvs6/lx8266/bin/zav_xa"), "-p", "-pc", "ux"},
                           after,
                           [&](int status) {
                               const std::string now = read("config/ux.cfg");
                               EXPECT_TRUE(now == before || now == after) << now.size();
                               if (status == 0) {
                                   EXPECT_EQ(now.size(), after.size());
                               }
                           },
                           [&] {
                               EXPECT_EQ(read("config/ux.cfg").size(), after.size());
                               EXPECT_EQ(leftIn("config"), "")
                                   << "what a killed program left is removed";
                           }});
}

TEST_F(TornFiles, EveryConfigurationThatGetsAServerIsTheOldOrTheNewOne) {
    const std::string before = "INSTANCE=b\nCMS=old\nA=" + std::string(9000, '1') + "\n";
    const std::string after = "INSTANCE=b\nA=" + std::string(9000, '1') + "\nCMS=hub1\n";
    write("config/.ConfigData/kmsenv", "hub1|CELLNAME|hub1|\n");
    killAndFailEverywhere({[&] { write("config/ux_b.cfg", before, 0600); },
                           {inHome("agtqvs6/lx8266/bin/zav_xa"), "-setCMS", "ux"},
                           "",
                           [&](int) {
                               const std::string now = read("config/ux_b.cfg");
                               EXPECT_TRUE(now == before || now == after) << now.size();
                           },
                           [&] { EXPECT_EQ(read("config/ux_b.cfg"), after); }});
}

TEST_F(TornFiles, ImportAndTheListOfDataProvidersAreTheOldOrTheNewOnes) {
    const std::string oldImport = "APPL=D\nDPTYPE=SOCK\n# " + std::string(9000, '1') + "\n";
    const std::string newImport = "APPL=D\nDPTYPE=SOCK\n# " + std::string(9500, '2') + "\n";
    const std::string configuration = read("config/um.config");
    write("config/.ConfigData/kumenv", "|DATAPROVIDER|FILE,SOCK|\n");
    std::string noted = configuration;
    noted.replace(noted.find("'FILE'"), 6, "'FILE,SOCK'");
    write("universal/metafiles/d.mdl", newImport);
    ::setenv("KUMP_DPCONSOLE_NOCONFIRM", "Y", 1);
    killAndFailEverywhere({[&] {
                               write("universal/work/imported/d.mdl", oldImport);
                               write("config/um.config", configuration, 0600);
                           },
                           {inHome("bin/um_console"), "-h", home(), "-c",
                            "IMPORT " + inHome("universal/metafiles/d.mdl")},
                           "",
                           [&](int) {
                               const std::string import = read("universal/work/imported/d.mdl");
                               EXPECT_TRUE(import == oldImport || import == newImport);
                               const std::string list = read("config/um.config");
                               EXPECT_TRUE(list == configuration || list == noted) << list;
                           },
                           [&] {
                               EXPECT_EQ(read("universal/work/imported/d.mdl"), newImport);
                               EXPECT_EQ(read("config/um.config"), noted);
                           }});
}

class TornProducts : public TornFiles {
protected:
    void SetUp() override {
        TornFiles::SetUp();
        ASSERT_EQ(run({source("bundles/make-bundle"), "ux", scratch.path("bundle")}).status, 0);
        install_ = {"/bin/sh", scratch.path("bundle/install.sh"), "-h", home(), "-a", "lx8266"};
        uninstall_ = {inHome("bin/uninstall.sh"), "-i", "ux", "lx8266"};
        oldEntry_ = "ProdCode=ux\nDescription=Old\nPlatform=lx8266\nVersion=000000001\nRelease=1\n";
        newEntry_ = read("registry/uxlx8266.ver");
        newFiles_ = files();
    }
    /// Names and contents of the product's files.
    std::string files() const {
        return run({"/bin/sh", "-c",
                    "cd " + inHome("agtqvs6/lx8266/ux") +
                        " && find . -type f -exec sha256sum {} + | sort -k 2"})
            .out;
    }
    std::string leftovers() const {
        return run({"/bin/sh", "-c",
                    "ls -A " + inHome("agtqvs6/lx8266") + " | grep '^[.]'; ls -A " +
                        inHome("registry") + " | grep '^[.]'"})
            .out;
    }
    void older() {
        std::filesystem::remove_all(inHome("agtqvs6/lx8266/ux"));
        write("agtqvs6/lx8266/ux/bin/agent", "#!/bin/sh\n# the old one\n", 0755);
        write("registry/uxlx8266.ver", oldEntry_);
        oldFiles_ = files();
    }

    std::vector<std::string> install_, uninstall_;
    std::string oldEntry_, newEntry_, oldFiles_, newFiles_;
};

TEST_F(TornProducts, InstallationIsAllOrNothingAndGoesOverWhatAnotherLeft) {
    killAndFailEverywhere({[&] { older(); }, install_, "",
                           [&](int status) {
                               const std::string entry = read("registry/uxlx8266.ver");
                               EXPECT_TRUE(entry == oldEntry_ || entry == newEntry_) << entry;
                               // Between two renames the product stands beside its place.
                               if (exists("agtqvs6/lx8266/ux")) {
                                   const std::string now = files();
                                   EXPECT_TRUE(now == oldFiles_ || now == newFiles_) << now;
                               } else {
                                   EXPECT_TRUE(exists("agtqvs6/lx8266/.ux.old/bin/agent"));
                               }
                               if (status == 0) {
                                   EXPECT_EQ(files(), newFiles_);
                               }
                           },
                           [&] {
                               EXPECT_EQ(files(), newFiles_);
                               EXPECT_EQ(read("registry/uxlx8266.ver"), newEntry_);
                               EXPECT_EQ(leftovers(), "");
                           }});
}

TEST_F(TornProducts, RemovalThatIsKilledIsFinishedByTheNext) {
    const int tries = rounds();
    int at = 1;
    for (int killed = 137; killed == 137 && !HasFailure(); at += std::max(1, 60 / tries)) {
        SCOPED_TRACE("killed at call " + std::to_string(at));
        ASSERT_EQ(run(install_).status, 0);
        write("config/ux_b.cfg", "INSTANCE=b\n");
        write("data/ux/figures.csv", "x\n");
        killed = interrupted(uninstall_, "", "kill", at).status;
        if (exists("agtqvs6/lx8266/ux")) {
            EXPECT_EQ(files(), newFiles_);
        }
        const Outcome again = run(uninstall_);
        EXPECT_THAT(again.status, AnyOf(0, 3)) << again.err;
        EXPECT_FALSE(exists("registry/uxlx8266.ver"));
        EXPECT_FALSE(exists("config/ux_b.cfg"));
        EXPECT_FALSE(exists("data/ux"));
        EXPECT_EQ(leftovers(), "");
    }
    EXPECT_GT(at, 10) << "it was interrupted at all";
}

TEST_F(TornProducts, DamagedManifestIsNotFollowedAndWhatItWouldRemoveIsNamed) {
    const std::string manifest = read("agtqvs6/lx8266/ux/.manifest");
    ASSERT_THAT(manifest, HasSubstr("./bin/agent\n"));
    std::string altered = manifest;
    altered[3] = altered[3] == '0' ? '1' : '0';
    const std::size_t lastLine = manifest.rfind('\n', manifest.size() - 2) + 1;
    for (const std::string& damaged :
         {std::string(), manifest.substr(0, manifest.size() / 2), manifest.substr(0, lastLine),
          manifest + "more\n", altered}) {
        write("agtqvs6/lx8266/ux/.manifest", damaged);
        const Outcome refused = run(uninstall_);
        EXPECT_EQ(refused.status, 28);
        EXPECT_THAT(refused.err, HasSubstr("is damaged"));
        EXPECT_THAT(refused.err, HasSubstr(inHome("agtqvs6/lx8266/ux,")));
        EXPECT_THAT(refused.err, HasSubstr(inHome("registry/uxlx8266.ver")));
        EXPECT_TRUE(exists("agtqvs6/lx8266/ux/bin/agent"));
    }
    EXPECT_EQ(run(install_).status, 0) << "the way out";
    EXPECT_EQ(run(uninstall_).status, 0);
}

TEST_F(TornProducts, BundleWhoseManifestWasCutIsRefused) {
    const std::string manifest = scratch.read("bundle/manifest");
    const std::size_t lastLine = manifest.rfind('\n', manifest.size() - 2) + 1;
    const std::size_t firstLine = manifest.find('\n') + 1;
    for (const std::size_t length : {lastLine, firstLine}) {
        scratch.write("bundle/manifest", manifest.substr(0, length));
        EXPECT_EQ(run(install_).status, 28);
    }
}

// ---- A full disk --------------------------------------------------------------------------------

TEST_F(TornFiles, FullDiskLeavesTheOldConfiguration) {
    const std::string before = "INSTANCE=\nA=" + std::string(20000, '1') + "\n";
    const std::string after = "INSTANCE=\nA=" + std::string(30000, '2') + "\n";
    write("config/ux.cfg", before, 0600);
    // A limit in blocks of 512 bytes at which writing fails.
    for (const int blocks : {0, 1, 30, 58}) {
        const Outcome full = run(
            {"/bin/sh", "-c", "trap '' XFSZ; ulimit -f " + std::to_string(blocks) + "; exec \"$@\"",
             "sh", inHome("agtqvs6/lx8266/bin/zav_xa"), "-p", "-pc", "ux"},
            after);
        EXPECT_EQ(full.status, 8) << blocks << full.err;
        EXPECT_EQ(read("config/ux.cfg").size(), before.size()) << blocks;
        EXPECT_EQ(leftIn("config"), "");
    }
}

TEST_F(TornProducts, FullDiskLeavesTheOldProduct) {
    older();
    for (const int blocks : {0, 1, 2}) {
        const Outcome full = run(
            {"/bin/sh", "-c", "trap '' XFSZ; ulimit -f " + std::to_string(blocks) + "; exec \"$@\"",
             "sh", install_[0], install_[1], install_[2], install_[3], install_[4], install_[5]});
        EXPECT_EQ(full.status, 8) << blocks << full.err;
        EXPECT_EQ(files(), oldFiles_);
        EXPECT_EQ(read("registry/uxlx8266.ver"), oldEntry_);
        EXPECT_EQ(leftovers(), "");
    }
}

TEST_F(TornFiles, FullFilesystemLeavesTheOldConfigurationAndStopsNoAgent) {
    // In a mount namespace of its own, a filesystem that holds a home and little more.
    const std::string script =
        "set -e; mkdir -p \"$2\"; mount -t tmpfs -o size=400k none \"$2\"; home=$2/home\n"
        "\"$1/home/bin/prepare-home\" \"$home\" --arch lx8266 >&2\n"
        "xa=$home/agtqvs6/lx8266/bin/zav_xa\n"
        "printf 'INSTANCE=\\nINTERVAL=1\\nSTART_SECONDS=0\\n' | \"$xa\" -p -pc ux\n"
        "\"$home/bin/TovrinAgent\" start ux >&2\n"
        "cp \"$home/config/ux.cfg\" \"$home/tmp/before\"\n"
        "dd if=/dev/zero of=\"$home/tmp/fill\" bs=1k 2>/dev/null || true\n"
        "{ echo INSTANCE=; head -c 20000 /dev/zero | tr '\\0' '#'; echo; echo A=1; } |\n"
        "    \"$xa\" -p -pc ux >&2 && echo written || echo status $?\n"
        "cmp \"$home/config/ux.cfg\" \"$home/tmp/before\" && echo same\n"
        "rm \"$home/tmp/fill\"; \"$home/bin/TovrinAgent\" stop ux >&2 && echo stopped\n";
    const Outcome able = run({"/usr/bin/unshare", "-rm", "true"});
    if (able.status != 0) GTEST_SKIP() << "no mount namespaces here: " << able.err;
    const Outcome full = run({"/usr/bin/unshare", "-rm", "/bin/sh", "-c", script, "sh",
                              ZAV_SOURCE_DIR, scratch.path("small")});
    EXPECT_EQ(full.out, "status 8\nsame\nstopped\n") << full.err;
}

}  // namespace
