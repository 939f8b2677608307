// The search for a Java installation.
#include <gmock/gmock.h>

#include <string>

#include "support/scoped_env.h"
#include "support/scratch_dir.h"
#include "support/trace_capture.h"
#include "util/zavutil.h"

using namespace ZAV;
using ::testing::Contains;
using ::testing::ElementsAre;

namespace {

constexpr const char* kNotJavaHome =
    "The JAVA_HOME variable is set in the environment, but does not appear to reference a valid "
    "Java location.";
constexpr const char* kJavaHomeUnset =
    "Checked for a Java location in JAVA_HOME, but that variable is not set in the environment.";
constexpr const char* kJavahomeUnset =
    "Checked for a Java location in JAVAHOME, but that variable is not set in the environment.";

class JavaHome : public ::testing::Test {
protected:
    std::string find(const char* before = "") {
        String found(before);
        Util::getJavaHome(scratch.path().c_str(), found);
        return static_cast<const char*>(found.c_str());
    }
    /// The errors traced by the search itself.
    std::vector<std::string> complaints() const {
        std::vector<std::string> found;
        for (const TraceLine& line : traces.lines()) {
            if (line.level == 'E' && line.function == "getJavaHome") found.push_back(line.text);
        }
        return found;
    }
    std::string script() const { return scratch.path("bin/TovrinGetJavaHome"); }

    ScratchDir scratch;
    ScopedEnv javaHome{"JAVA_HOME", nullptr};
    ScopedEnv javahome{"JAVAHOME", nullptr};
    TraceCapture traces;
};

TEST_F(JavaHome, IsTheFirstLineThatTheScriptPrints) {
    scratch.script("bin/TovrinGetJavaHome", "echo /opt/java; echo more");
    EXPECT_EQ(find(), "/opt/java");
    EXPECT_THAT(traces.details("zavutil"),
                Contains("JavaHome location script is [" + script() + "]"));
    EXPECT_THAT(complaints(), ElementsAre());
}

TEST_F(JavaHome, OutputOfAFailingScriptIsTaken) {
    scratch.script("bin/TovrinGetJavaHome", "echo /opt/java; exit 3");
    EXPECT_EQ(find(), "/opt/java");
}

TEST_F(JavaHome, WithoutTheScriptTheEnvironmentIsAsked) {
    const std::string dir = scratch.makeDir("java");
    javaHome.set(dir.c_str());
    EXPECT_EQ(find(), dir);
    EXPECT_THAT(complaints(),
                ElementsAre("The JavaHome location script [" + script() + "] was not found"));
    EXPECT_THAT(traces.details("zavutil"),
                Contains("Found a valid Java location in JAVA_HOME: \"" + dir + "\""));
}

TEST_F(JavaHome, DirectoryInPlaceOfTheScriptIsNotRun) {
    scratch.makeDir("bin/TovrinGetJavaHome");
    EXPECT_EQ(find(), "");
    EXPECT_THAT(complaints(),
                ElementsAre("The JavaHome location script [" + script() + "] was not found",
                            kJavaHomeUnset, kJavahomeUnset));
}

TEST_F(JavaHome, SilentScriptLeavesItToTheEnvironment) {
    scratch.script("bin/TovrinGetJavaHome", "exit 0");
    const std::string dir = scratch.makeDir("java");
    javahome.set(dir.c_str());
    EXPECT_EQ(find(), dir);
    EXPECT_THAT(complaints(),
                ElementsAre("The JavaHome script [" + script() + "] failed or returned no value",
                            kJavaHomeUnset));
    EXPECT_THAT(traces.details("zavutil"),
                Contains("Found a valid Java location in JAVAHOME: \"" + dir + "\""));
}

TEST_F(JavaHome, ScriptThatCannotRunLeavesItToTheEnvironment) {
    scratch.write("bin/TovrinGetJavaHome", "echo /opt/java\n", 0644);
    EXPECT_EQ(find(), "");
    EXPECT_THAT(complaints(),
                Contains("The JavaHome script [" + script() + "] failed or returned no value"));
}

TEST_F(JavaHome, EmptyFirstLineLeavesItToTheEnvironment) {
    scratch.script("bin/TovrinGetJavaHome", "echo");
    const std::string dir = scratch.makeDir("java");
    javaHome.set(dir.c_str());
    EXPECT_EQ(find(), dir);
}

TEST_F(JavaHome, OutputThatBeginsWithACarriageReturnThrows) {
    scratch.script("bin/TovrinGetJavaHome", "printf '\\r\\n'");
    EXPECT_THROW(find(), IndexOutOfBoundsException);
}

TEST_F(JavaHome, VariableThatNamesAFileIsRejectedAndTheNextOneTried) {
    javaHome.set(scratch.write("file", "").c_str());
    const std::string dir = scratch.makeDir("java");
    javahome.set(dir.c_str());
    EXPECT_EQ(find(), dir);
    EXPECT_THAT(complaints(), Contains(kNotJavaHome));
}

TEST_F(JavaHome, VariableThatNamesNothingIsRejected) {
    javaHome.set(scratch.path("none").c_str());
    EXPECT_EQ(find(), "");
    EXPECT_THAT(complaints(),
                ElementsAre("The JavaHome location script [" + script() + "] was not found",
                            kNotJavaHome, kJavahomeUnset));
}

TEST_F(JavaHome, EmptyVariableCountsAsUnset) {
    javaHome.set("");
    EXPECT_EQ(find(), "");
    EXPECT_THAT(complaints(), Contains(kJavaHomeUnset));
}

TEST_F(JavaHome, ValueIsTakenAsItIsAndTheEnvironmentLeftAlone) {
    const std::string quoted = "\"" + scratch.makeDir("java") + "/\"";
    javaHome.set(quoted.c_str());
    EXPECT_EQ(find(), quoted);
    EXPECT_EQ(std::getenv("JAVA_HOME"), quoted);
}

TEST_F(JavaHome, ValueFromBeforeStaysWhenTheScriptGivesNone) {
    javaHome.set(scratch.makeDir("java").c_str());
    EXPECT_EQ(find("/before"), "/before");
}

}  // namespace
