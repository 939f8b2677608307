#include "ctl/client/address/no_host.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>

#include "support/scratch_dir.h"

namespace {

TEST(NoHost, WhereNobodyListensSaysHowToStartOne) {
    for (const int error : {ENOENT, ECONNREFUSED}) {
        const ctl::Failure failure = ctl::noHost("/run/s", error);
        EXPECT_EQ(failure.status(), ctl::kNoHost);
        EXPECT_EQ(failure.hint(), "start one with: zavhost --home DIR --socket /run/s");
    }
    EXPECT_EQ(ctl::noHost("/run/s.rpc", ENOENT).hint(),
              "start one with: zavhost --home DIR --socket /run/s");
    EXPECT_STREQ(ctl::noHost("/run/s", ENOENT).what(),
                 "no host reached at /run/s: No such file or directory");
}

TEST(NoHost, ThatLetsOneInSaysWhoMay) {
    const ScratchDir scratch;
    const std::string path = scratch.write("s", "");
    ASSERT_EQ(::chmod(path.c_str(), 0600), 0);
    if (::geteuid() == 0) {
        EXPECT_EQ(ctl::noHost(path, EACCES).hint(), "only root may use the socket");
        ASSERT_EQ(::chown(path.c_str(), 12345, 12346), 0);
        EXPECT_EQ(ctl::noHost(path, EACCES).hint(),
                  "only root and the user 12345 may use the socket");
        ASSERT_EQ(::chmod(path.c_str(), 0660), 0);
        EXPECT_EQ(ctl::noHost(path, EACCES).hint(),
                  "only root and the user 12345 and the group 12346 may use the socket");
    } else {
        EXPECT_NE(ctl::noHost(path, EACCES).hint().find("only root and the user "),
                  std::string::npos);
    }
    EXPECT_EQ(ctl::noHost(scratch.path("gone"), EACCES).hint(),
              "only its host's user and root may see the socket");
}

TEST(NoHost, ForAnotherReasonSaysNoMore) {
    EXPECT_EQ(ctl::noHost("/run/s", ENAMETOOLONG).hint(), "");
}

}  // namespace
