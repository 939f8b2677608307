// The client for Python: that it is made from the interface's description, and what it does with a
// real host.

#include <gmock/gmock.h>

#include <fstream>
#include <nlohmann/json.hpp>
#include <sstream>

#include "support/host/managed_host.h"
#include "support/host/script_home.h"
#include "support/host/starter_home.h"

namespace {

using testing::HasSubstr;

constexpr const char* kPython = "/usr/bin/python3";
constexpr const char* kClient = ZAV_SOURCE_DIR "/contrib/python";

std::string textOf(const std::string& path) {
    std::ifstream in(path);
    std::ostringstream text;
    text << in.rdbuf();
    return text.str();
}

ProgramResult python(std::vector<std::string> words) {
    words.insert(words.begin(), kPython);
    return runProgram(words, "", {{"PYTHONDONTWRITEBYTECODE", "1"}, {"PYTHONPATH", kClient}},
                      std::chrono::minutes(2));
}

TEST(PythonClient, IsMadeFromTheDescription) {
    const ScratchDir scratch;
    const std::string made = scratch.path("operations.py");
    const ProgramResult result =
        python({std::string(kClient) + "/generate.py", ZAV_SOURCE_DIR "/docs/openapi.json", made});
    ASSERT_EQ(result.status, 0) << result.err;
    EXPECT_EQ(textOf(made), textOf(std::string(kClient) + "/zavhost/operations.py"))
        << "write it anew with: cmake --build --preset native --target interface";
}

TEST(PythonClient, DoesWhatItsMethodsSay) {
    ScriptHome home;
    home.products({"ux"}, "exit 0");
    home.agentScript("echo said");
    home.files().write("depot/notes", "abc");
    const ManagedHost host(home.path(), {{"QVSDEPLOY_AGENTDEPOT", home.depot()}}, {},
                           ManagedHost::Guards::On);
    const ProgramResult result = python(
        {ZAV_SOURCE_DIR "/tests/contrib/python_client.py", host.socket(), home.files().path("")});
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_THAT(result.err, HasSubstr("\nOK\n"));
}

class PythonExample : public testing::Test {
protected:
    PythonExample() : version(home.makeBundle("ux", bundle)) {
        EXPECT_EQ(host.zavctl({"push", bundle, "ux/" + version}).status, 0);
    }
    ProgramResult install(const std::string& wantedVersion) const {
        return python({std::string(kClient) + "/examples/install_product.py", host.socket(), "ux",
                       wantedVersion, "/bin/sh |DEPLOYDIR|/install.sh -h |TOVRINHOME|"});
    }

    StarterHome home{""};
    const std::string bundle = home.files().path("bundle");
    ManagedHost host{home.path(), home.environment(), {}, ManagedHost::Guards::On};
    const std::string version;
};

TEST_F(PythonExample, InstallsAProduct) {
    const ProgramResult result = install(version);
    EXPECT_EQ(result.status, 0) << result.out << result.err;
    EXPECT_THAT(result.out, HasSubstr("ux " + version + ": done\n"));
    EXPECT_THAT(result.out, HasSubstr("installed: ux "));
    EXPECT_THAT(host.zavctl({"agents"}).out, HasSubstr("\nux "));
}

TEST_F(PythonExample, SaysWhyAProductIsNotInstalled) {
    const ProgramResult result = install("0.0");
    EXPECT_EQ(result.status, 1);
    EXPECT_THAT(result.err, HasSubstr("0.0"));
    EXPECT_EQ(host.zavctl({"agents"}).out.find("\nux "), std::string::npos);
}

}  // namespace
