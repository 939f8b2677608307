// ctest-label: threaded
#include "fleet/link/enrol/enrol_command.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <sstream>
#include <string>
#include <vector>

#include "fleet/link/enrol/invited_host.h"
#include "support/host/program.h"

namespace {

struct Answer {
    int status = -1;
    std::string out;
    std::string err;
};

Answer run(const std::vector<std::string>& words, const std::string& input = "") {
    std::istringstream in(input);
    std::ostringstream out;
    std::ostringstream err;
    const int status = fleet::runEnrolCommand(words, in, out, err);
    return {status, out.str(), err.str()};
}

TEST(EnrolCommand, HelpsThoseWhoAsk) {
    const Answer help = run({"--help"});
    EXPECT_EQ(help.status, 0);
    EXPECT_NE(help.out.find("--directory"), std::string::npos);
    EXPECT_NE(help.out.find("zavfleetd enrol"), std::string::npos);
}

TEST(EnrolCommand, RefusesWordsThatMakeNoSense) {
    EXPECT_EQ(run({}).status, 2);
    EXPECT_EQ(run({"--wrong", "x"}).status, 2);
    EXPECT_EQ(run({"one", "two"}).status, 2);
}

TEST(EnrolCommand, SaysWhatIsWrongInOneLine) {
    EXPECT_EQ(run({"x"}).err, "fleet: this is no invitation to a fleet; copy the whole line\n");
    EXPECT_EQ(run({"-"}).err, "fleet: standard input holds no invitation\n");
    EXPECT_EQ(run({"-"}, "\n").err, "fleet: standard input holds no invitation\n");
    EXPECT_EQ(run({"-"}, std::string(100'000, 'x')).err,
              "fleet: this is no invitation to a fleet; copy the whole line\n");
    for (const char* const label : {"env", "=test", "env="}) {
        const Answer wrong = run({"--label", label, "x"});
        EXPECT_EQ(wrong.status, 1);
        EXPECT_EQ(wrong.err,
                  "fleet: \"" + std::string(label) + "\" is no label; it is NAME=VALUE\n");
    }
    EXPECT_EQ(run({"--label", "a=b", "--label", "a=c", "x"}).err,
              "fleet: the label \"a\" is given twice\n");
}

TEST(EnrolCommand, JoinsWithAnInvitationFromStandardInput) {
    fleet_test::InvitedHost host;
    host.startCentre(host.takesUpProgram());
    const ProgramResult result = host.runProgramWith(host.invitation());
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_EQ(result.out.rfind("This host is \"web1\" of the fleet \"demo\" now (U", 0), 0U);
    EXPECT_NE(host.scratch.read("zavlink.toml").find("[labels]\n\"env\" = \"test\"\n"),
              std::string::npos);
    EXPECT_TRUE(host.scratch.exists("link/link.json"));
}

/// Who owns a file, and in which group and mode it is.
std::vector<unsigned> rightsOf(const std::string& path) {
    struct stat found {};
    EXPECT_EQ(::stat(path.c_str(), &found), 0) << path;
    return {found.st_uid, found.st_gid, found.st_mode & 07777U};
}

TEST(EnrolCommand, GivesTheLinksFilesToTheOwnerOfItsDirectory) {
    if (::geteuid() != 0) GTEST_SKIP() << "only root enrols for another user";
    constexpr unsigned kUser = 65534;
    fleet_test::InvitedHost host;
    ASSERT_EQ(::chmod(host.scratch.path().c_str(), 0755), 0);
    ASSERT_EQ(::chown(host.options.directory.c_str(), kUser, kUser), 0);
    host.startCentre(host.takesUpProgram());
    const ProgramResult result = host.runProgramWith(host.invitation());
    EXPECT_EQ(result.status, 0) << result.err;
    EXPECT_EQ(rightsOf(host.scratch.path("link/link.json")),
              (std::vector<unsigned>{kUser, kUser, 0600}));
    EXPECT_EQ(rightsOf(host.scratch.path("link/ca.pem")),
              (std::vector<unsigned>{kUser, kUser, 0644}));
    EXPECT_EQ(rightsOf(host.options.configuration), (std::vector<unsigned>{0, 0, 0644}));
}

}  // namespace
