#include "fleet/operator/identity/operator_files.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <fstream>
#include <optional>
#include <string>

#include "fleet/bus/messages/document.h"
#include "fleet/files/file_error.h"
#include "fleet/https/client/server_url.h"
#include "support/scoped_env.h"
#include "support/scratch_dir.h"
#include "tests/fleet/operator/certified.h"

namespace {

using fleet::FileError;
using fleet::Invitation;
using fleet::OperatorFiles;
using fleet::OperatorIdentity;
using fleet::PendingLogin;

constexpr const char* kUrl = "https://centre.example:8443";

unsigned modeOf(const std::string& path) {
    struct stat found {};
    return ::stat(path.c_str(), &found) == 0 ? found.st_mode & 0777U : 0;
}

class OperatorFilesTest : public testing::Test {
protected:
    const ScratchDir scratch_;
    const std::string directory_ = scratch_.path("config/zavctl/fleet");
    const OperatorFiles files_{directory_};
    const operator_test::Root root_;
};

TEST_F(OperatorFilesTest, KeepTheIdentityOfEachFleetForTheirOwnerOnly) {
    EXPECT_FALSE(files_.identity(kUrl).has_value());
    const OperatorIdentity sent = root_.certified({"START"}, {"ux"});
    files_.keep(sent);
    const std::optional<OperatorIdentity> read = files_.identity("https://centre.example/");
    ASSERT_TRUE(read.has_value());
    EXPECT_EQ(read->url, sent.url);
    EXPECT_EQ(read->fleet, "demo");
    EXPECT_EQ(read->root, sent.root);
    EXPECT_EQ(read->authority, "authority");
    EXPECT_EQ(read->key.seed(), sent.key.seed());
    EXPECT_EQ(read->certificate, sent.certificate);
    EXPECT_EQ(read->grant().name, "mary");
    EXPECT_EQ(modeOf(directory_), 0700U);
    EXPECT_EQ(modeOf(directory_ + "/centre.example_8443.json"), 0600U);
    EXPECT_FALSE(files_.identity("https://other.example").has_value());
    EXPECT_THROW(files_.identity("centre"), fleet::UrlError);
}

TEST_F(OperatorFilesTest, KeepALoginThatIsUnderWay) {
    const PendingLogin sent{
        {kUrl, std::string(64, 'a'), "demo", root_.key.publicKey(), fleet::makeJoinToken()},
        operator_test::newUser()};
    EXPECT_FALSE(files_.pendingLogin(kUrl).has_value());
    files_.keep(sent);
    const std::optional<PendingLogin> read = files_.pendingLogin(kUrl);
    ASSERT_TRUE(read.has_value());
    EXPECT_EQ(read->invitation.token, sent.invitation.token);
    EXPECT_EQ(read->key.publicKey(), sent.key.publicKey());
    EXPECT_EQ(modeOf(directory_ + "/centre.example_8443.login.json"), 0600U);
    files_.forgetPendingLogin(kUrl);
    files_.forgetPendingLogin(kUrl);
    EXPECT_FALSE(files_.pendingLogin(kUrl).has_value());
}

TEST_F(OperatorFilesTest, RefuseWhatOthersMayUse) {
    files_.keep(root_.certified({"START"}, {"ux"}));
    ::chmod((directory_ + "/centre.example_8443.json").c_str(), 0640);
    EXPECT_THROW(files_.identity(kUrl), FileError);
    ::chmod(directory_.c_str(), 0750);
    EXPECT_THROW(OperatorFiles{directory_}, FileError);
}

TEST_F(OperatorFilesTest, RefuseADamagedFile) {
    files_.keep(root_.certified({"START"}, {"ux"}));
    const std::string file = directory_ + "/centre.example_8443.json";
    for (const char* const text : {"", "{", "[]", "{}", R"({"url":1})"}) {
        std::ofstream(file) << text;
        EXPECT_THROW(files_.identity(kUrl), FileError) << text;
    }
}

TEST_F(OperatorFilesTest, AreFoundByTheEnvironment) {
    const ScopedEnv home("HOME", "/home/mary");
    {
        const ScopedEnv configuration("XDG_CONFIG_HOME", "/config");
        EXPECT_EQ(OperatorFiles::usualDirectory(), "/config/zavctl/fleet");
    }
    const ScopedEnv none("XDG_CONFIG_HOME", "");
    EXPECT_EQ(OperatorFiles::usualDirectory(), "/home/mary/.config/zavctl/fleet");
    const ScopedEnv nowhere("HOME", "");
    EXPECT_THROW(OperatorFiles::usualDirectory(), FileError);
}

TEST(OperatorIdentity, CountsOnlyWithACertificateOfItsRootForItsKey) {
    const operator_test::Root root;
    OperatorIdentity identity = root.certified({"START"}, {"ux"});
    EXPECT_EQ(identity.grant().commands, std::vector<std::string>{"START"});
    OperatorIdentity other = root.certified({"*"}, {"*"});
    std::swap(identity.certificate, other.certificate);
    EXPECT_THROW(identity.grant(), fleet::MessageError);
    const operator_test::Root another;
    OperatorIdentity foreign = another.certified({"START"}, {"ux"});
    foreign.root = root.key.publicKey();
    EXPECT_THROW(foreign.grant(), fleet::MessageError);
}

}  // namespace
