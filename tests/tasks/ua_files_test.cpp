#include "tasks/ua_files.h"

#include <dlfcn.h>
#include <gmock/gmock.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <map>

#include "support/trace_capture.h"
#include "tasks/task_home.h"

using testing::ElementsAre;
using testing::IsEmpty;
using testing::SizeIs;
using ZAV::String;
using ZAV::StrStrMap;

// This definition replaces the C library's, so that removing a file can fail.
namespace {
bool removingFails = false;
bool directoryTakesItsPlace = false;
}  // namespace

extern "C" int unlink(const char* path) noexcept {
    if (removingFails) {
        errno = EBUSY;
        return -1;
    }
    static const auto next = reinterpret_cast<int (*)(const char*)>(::dlsym(RTLD_NEXT, "unlink"));
    const int result = next(path);
    if (directoryTakesItsPlace) ::mkdir(path, 0755);
    return result;
}

namespace {

class UaFiles : public testing::Test {
protected:
    TaskHome home_;
    TraceCapture trace_{"ERROR (UNIT:zavtasks ALL)"};
};

TEST_F(UaFiles, TheDefaultInstanceHasTheFileWithoutAName) {
    EXPECT_EQ(narrow(getUaConfigFileName("")), home_.home() + "/config/um.config");
    EXPECT_THAT(trace_.details("zavtasks"),
                ElementsAre("UA Configuration file is \"" + home_.home() +
                            "/config/um.config\", instance (optional) is \"\""));
}

TEST_F(UaFiles, AnInstanceHasAFileWithItsName) {
    EXPECT_EQ(narrow(getUaConfigFileName("A")), home_.home() + "/config/um_A.config");
    EXPECT_THAT(trace_.details("zavtasks"),
                ElementsAre("UA Configuration file is \"" + home_.home() +
                            "/config/um_A.config\", instance (optional) is \"A\""));
}

TEST_F(UaFiles, TheInstanceStandsBeforeTheHost) {
    const std::pair<const char*, const char*> names[] = {
        {"inst1:hostA:UA", "inst1"},
        {"inst1:hostA:UA2", "inst1"},
        {"a:b:c:UA", "a"},
        {"hostA:UA", ""},
        {"inst1:hostA:UX", ""},
        {"inst1:hostA", ""},
        {":UA", ""},
        {"", ""},
        {":hostA:UA", ""},
        {"A:UABOX:UA", ""},
        {":", ""},
        {"inst1:hostA:ua", ""},
    };
    for (const auto& [name, instance] : names) {
        trace_.clear();
        EXPECT_EQ(narrow(getUaInstanceName(name)), instance) << name;
        EXPECT_THAT(trace_.details("zavtasks"),
                    ElementsAre("Returning instance <" + std::string(instance) +
                                "> for managed system name <" + name + ">"));
    }
}

using Pairs = std::map<std::string, std::string>;

Pairs pairsIn(const StrStrMap& map) {
    Pairs pairs;
    const ZAV::Array<String> keys = map.getKeys();
    for (std::uint32_t i = 0; i < keys.getSize(); ++i) {
        String value;
        EXPECT_TRUE(map.get(keys[i], value));
        pairs[narrow(keys[i])] = narrow(value);
    }
    return pairs;
}

class PairsOfFile : public UaFiles {
protected:
    Pairs pairs(const std::string& content, char comment = '*') const {
        return pairsIn(
            populateHashMapFromFile(home_.dir().write("pairs", content).c_str(), comment));
    }
};

TEST_F(PairsOfFile, AreReadLineByLine) {
    EXPECT_EQ(pairs("A=1\nB=2\n"), (Pairs{{"A", "1"}, {"B", "2"}}));
    EXPECT_EQ(pairs("\n\nA=1\n\n\nB=2"), (Pairs{{"A", "1"}, {"B", "2"}}));
}

TEST_F(PairsOfFile, LeaveOutComments) {
    EXPECT_EQ(pairs("*A=1\n   * C=3\n\t*\nB=2\n"), (Pairs{{"B", "2"}}));
    EXPECT_EQ(pairs("*A=1\n#B=2\n", '#'), (Pairs{{"*A", "1"}}));
}

TEST_F(PairsOfFile, SplitAtTheFirstEqualsSign) {
    EXPECT_EQ(pairs("A=1=2\nB==\n"), (Pairs{{"A", "1=2"}, {"B", "="}}));
}

TEST_F(PairsOfFile, NeedANameAndAValue) {
    EXPECT_EQ(pairs("A=\n=1\n=\nword\n   \nB=  \n"), Pairs{});
}

TEST_F(PairsOfFile, KeepTheLastOfSeveralValues) {
    EXPECT_EQ(pairs("A=1\nA=2\nA=\n"), (Pairs{{"A", "2"}}));
}

TEST_F(PairsOfFile, AreTrimmedAsLinesOnly) {
    EXPECT_EQ(pairs("  A = 1 2 \t\n"), (Pairs{{"A ", " 1 2"}}));
}

TEST_F(PairsOfFile, MayHaveCarriageReturns) {
    EXPECT_EQ(pairs("A=1\r\n\r\n*x\r\nB=2\r\n"), (Pairs{{"A", "1"}, {"B", "2"}}));
}

TEST_F(PairsOfFile, AreNoneInAFileThatIsEmptyOrMissing) {
    EXPECT_EQ(pairs(""), Pairs{});
    EXPECT_EQ(pairs("\n\n"), Pairs{});
    EXPECT_EQ(pairsIn(populateHashMapFromFile(home_.dir().path("none").c_str(), '*')), Pairs{});
}

class StartupParms : public UaFiles {
protected:
    /// Changes a file with `content`. Returns its content afterwards.
    std::string changed(const std::string& content, const char* parms, const char* instance) {
        const std::string file = home_.dir().write("home/kumenv", content);
        EXPECT_EQ(changeUaStartupParms(file.c_str(), parms, instance), 1);
        EXPECT_FALSE(home_.dir().exists("home/kumenv.copy"));
        return home_.dir().read("home/kumenv");
    }
    std::string file() const { return home_.home() + "/kumenv"; }
};

TEST_F(StartupParms, ReplaceTheInstancesLine) {
    EXPECT_EQ(changed("*x\nA|DATAPROVIDER|ASFS|\nB|DATAPROVIDER|ASFS|\n", "ASFS,SNMP", "A"),
              "*x\nA|DATAPROVIDER|ASFS,SNMP|\nB|DATAPROVIDER|ASFS|\n");
    EXPECT_EQ(trace_.count('D', "Writing startup parms [ASFS,SNMP] to config file [" + file() +
                                    "] instance [A]"),
              1);
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(StartupParms, ReplaceEveryLineOfTheInstance) {
    EXPECT_EQ(changed("A|DATAPROVIDER|1|\nother\n  xA|DATAPROVIDER|2|tail", "X", "A"),
              "A|DATAPROVIDER|X|\nother\nA|DATAPROVIDER|X|\n");
}

TEST_F(StartupParms, OfTheDefaultInstanceHaveAMarkerThatBeginsWithABar) {
    EXPECT_EQ(changed("|DATAPROVIDER|ASFS|\n*y\n", "X", ""), "|DATAPROVIDER|X|\n*y\n");
}

TEST_F(StartupParms, AreOnlyRewrittenWithoutAMarker) {
    EXPECT_EQ(changed("a\n\n\nb", "X", "A"), "a\nb\n");
    EXPECT_EQ(changed("\n\n", "X", "A"), "");
}

TEST_F(StartupParms, KeepCarriageReturnsOfOtherLines) {
    EXPECT_EQ(changed("a\r\nA|DATAPROVIDER|1|\r\n\r\nb\r\n", "X", "A"),
              "a\r\nA|DATAPROVIDER|X|\n\r\nb\r\n");
}

TEST_F(StartupParms, OfALargeFileAreChanged) {
    std::string content;
    std::string expected;
    for (int i = 0; i < 200000; ++i) {
        content += "A line of a large file\n";
        expected += "A line of a large file\n";
    }
    EXPECT_EQ(changed(content + "A|DATAPROVIDER|1|", "X", "A"), expected + "A|DATAPROVIDER|X|\n");
}

TEST_F(StartupParms, OfAFileThatMayOnlyBeReadAreChanged) {
    home_.dir().write("home/kumenv", "A|DATAPROVIDER|1|\n", 0444);
    EXPECT_EQ(changeUaStartupParms(file().c_str(), "X", "A"), 1);
    EXPECT_EQ(home_.dir().read("home/kumenv"), "A|DATAPROVIDER|X|\n");
    EXPECT_FALSE(home_.dir().exists("home/kumenv.copy"));
    EXPECT_THAT(trace_.errors(), IsEmpty());
}

TEST_F(StartupParms, NeedAFileWithContent) {
    home_.dir().write("home/kumenv", "");
    EXPECT_EQ(changeUaStartupParms(file().c_str(), "X", "A"), 0);
    EXPECT_EQ(changeUaStartupParms((file() + ".none").c_str(), "X", "A"), 0);
    EXPECT_EQ(trace_.count('E', "Contents of config file [" + file() + "] was empty"), 1);
    EXPECT_EQ(trace_.count('E', "Contents of config file [" + file() + ".none] was empty"), 1);
    EXPECT_TRUE(home_.dir().exists("home/kumenv"));
    EXPECT_FALSE(home_.dir().exists("home/kumenv.copy"));
}

TEST_F(StartupParms, AreLeftAloneWhenTheCopyCannotBeWritten) {
    home_.dir().write("home/kumenv", "A|DATAPROVIDER|1|\n");
    home_.dir().makeDir("home/kumenv.copy");
    EXPECT_EQ(changeUaStartupParms(file().c_str(), "X", "A"), 0);
    EXPECT_EQ(home_.dir().read("home/kumenv"), "A|DATAPROVIDER|1|\n");
    EXPECT_EQ(trace_.count('E', "Failed to write to file " + file()), 1);
}

TEST_F(StartupParms, StayInTheCopyWhenThePathHasNoDirectory) {
    // Only a relative path has no directory part and is still writable for a test.
    const std::string before = std::filesystem::current_path();
    std::filesystem::current_path(home_.home());
    home_.dir().write("home/kumenv", "A|DATAPROVIDER|1|\n");
    EXPECT_EQ(changeUaStartupParms("kumenv", "X", "A"), 0);
    std::filesystem::current_path(before);
    EXPECT_FALSE(home_.dir().exists("home/kumenv"));
    EXPECT_EQ(home_.dir().read("home/kumenv.copy"), "A|DATAPROVIDER|X|\n");
    EXPECT_EQ(trace_.count('E', "Directory [kumenv] cannot be parsed, no dir separator"), 1);
}

TEST_F(StartupParms, StayInTheCopyWhenTheFileCannotBeRemoved) {
    home_.dir().write("home/kumenv", "A|DATAPROVIDER|1|\n");
    removingFails = true;
    EXPECT_EQ(changeUaStartupParms(file().c_str(), "X", "A"), 0);
    removingFails = false;
    EXPECT_EQ(home_.dir().read("home/kumenv"), "A|DATAPROVIDER|1|\n");
    EXPECT_EQ(home_.dir().read("home/kumenv.copy"), "A|DATAPROVIDER|X|\n");
    EXPECT_EQ(trace_.count(
                  'E', "Failed to delete file " + file() + " error was: Device or resource busy"),
              1);
}

TEST_F(StartupParms, StayInTheCopyWhenItCannotBeCopiedBack) {
    home_.dir().write("home/kumenv", "A|DATAPROVIDER|1|\n");
    directoryTakesItsPlace = true;
    EXPECT_EQ(changeUaStartupParms(file().c_str(), "X", "A"), 0);
    directoryTakesItsPlace = false;
    EXPECT_EQ(home_.dir().read("home/kumenv.copy"), "A|DATAPROVIDER|X|\n");
}

TEST_F(StartupParms, LeaveNoDescriptorOpen) {
    changed("A|DATAPROVIDER|1|\n", "X", "A");
    const auto before = openDescriptors();
    changed("A|DATAPROVIDER|1|\n", "X", "A");
    home_.dir().makeDir("home/kumenv.copy");
    EXPECT_EQ(changeUaStartupParms(file().c_str(), "X", "A"), 0);
    EXPECT_EQ(openDescriptors(), before);
}

}  // namespace
