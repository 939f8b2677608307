// ctest-label: threaded
// Who a client is: the kernel is asked about real connections of processes with other users and
// groups.
#include "host/peers/peer_of.h"

#include <grp.h>
#include <gtest/gtest.h>
#include <sys/socket.h>
#include <sys/stat.h>
#include <sys/wait.h>
#include <unistd.h>

#include <vector>

#include "host/process/socket_file.h"
#include "host/raw_client.h"
#include "support/scratch_dir.h"
#include "system/file_descriptor.h"

namespace {

using host::AccessGroups;
using host::Group;
using host::peerOf;
using http::Access;
using http::Peer;

constexpr uid_t kNobody = 65534;
constexpr gid_t kNogroup = 65534;
constexpr gid_t kOperators = 4711;
constexpr gid_t kReaders = 4712;

class PeersOfGroups : public testing::Test {
protected:
    void SetUp() override {
        if (::geteuid() != 0) GTEST_SKIP() << "only root can become another user";
        ASSERT_EQ(::chmod(scratch_.path().c_str(), 0755), 0);
        listener_ = socket_.listen();
    }

    /// How a process with these groups is judged.
    http::Peer judged(uid_t user, gid_t own, const std::vector<gid_t>& further,
                      const AccessGroups& groups) {
        int ends[2];
        EXPECT_EQ(::pipe(ends), 0);
        const pid_t child = ::fork();
        if (child == 0) {
            const bool became = ::setgroups(further.size(), further.data()) == 0 &&
                                ::setgid(own) == 0 && ::setuid(user) == 0;
            const RawClient client(socket_.path());
            char byte = 0;
            ::close(ends[1]);
            const bool judged = ::read(ends[0], &byte, 1) == 0;  // the parent closes it then
            ::_exit(became && client.connected() && judged ? 0 : 1);
        }
        ::close(ends[0]);
        int accepted = -1;
        EXPECT_TRUE(eventually([&] {
            accepted = ::accept(listener_, nullptr, nullptr);
            return accepted >= 0;
        }));
        const sys::FileDescriptor connection(accepted);
        const http::Peer peer = peerOf(connection.get(), groups);
        ::close(ends[1]);
        int status = -1;
        EXPECT_EQ(::waitpid(child, &status, 0), child);
        EXPECT_EQ(status, 0);
        EXPECT_EQ(peer.process, child);
        EXPECT_EQ(peer.user, user);
        return peer;
    }
    static AccessGroups both() {
        return {Group{"operators", kOperators}, Group{"readers", kReaders}};
    }

    ScratchDir scratch_;
    host::SocketFile socket_{scratch_.path("s"), host::Connects::Everybody};
    int listener_ = -1;
};

TEST_F(PeersOfGroups, MayDoWhatTheirOwnGroupMay) {
    EXPECT_EQ(judged(kNobody, kOperators, {}, both()).access, http::Access::Act);
    const http::Peer reader = judged(kNobody, kReaders, {}, both());
    EXPECT_EQ(reader.access, http::Access::Read);
    EXPECT_EQ(reader.reason, "a member of the read-only group readers");
}

TEST_F(PeersOfGroups, MayDoWhatAnyOfTheirGroupsMay) {
    const http::Peer acting = judged(kNobody, kNogroup, {1, kOperators, 2}, both());
    EXPECT_EQ(acting.access, http::Access::Act);
    EXPECT_EQ(acting.reason, "a member of the group operators");
    EXPECT_EQ(judged(kNobody, kNogroup, {kReaders, kOperators}, both()).access, http::Access::Act);
    EXPECT_EQ(judged(kNobody, kReaders, {kOperators}, both()).access, http::Access::Act);
    EXPECT_EQ(judged(kNobody, kNogroup, {1, 2, kReaders}, both()).access, http::Access::Read);
}

TEST_F(PeersOfGroups, MayBeMembersOfVeryMany) {
    std::vector<gid_t> many;
    for (gid_t group = 10'000; group < 11'000; ++group)
        many.push_back(group);
    EXPECT_EQ(judged(kNobody, kNogroup, many, both()).access, http::Access::None);
    many.push_back(kReaders);
    EXPECT_EQ(judged(kNobody, kNogroup, many, both()).access, http::Access::Read);
}

TEST_F(PeersOfGroups, OfOtherGroupsHaveNoAccess) {
    const http::Peer stranger = judged(kNobody, kNogroup, {1, 2}, both());
    EXPECT_EQ(stranger.access, http::Access::None);
    EXPECT_EQ(stranger.reason, "");
    EXPECT_EQ(judged(kNobody, kOperators, {kReaders}, {}).access, http::Access::None)
        << "nobody has named a group";
    EXPECT_EQ(judged(kNobody, kOperators, {}, {{}, Group{"readers", kReaders}}).access,
              http::Access::None);
}

TEST_F(PeersOfGroups, NeedNoneAsRoot) {
    const http::Peer root = judged(0, kNogroup, {kReaders}, both());
    EXPECT_EQ(root.access, http::Access::Act);
    EXPECT_EQ(root.reason, "root");
}

TEST(Refusals, NameThoseWhoAreServed) {
    const Group operators{"ops", 1};
    const Group readers{"staff", 2};
    EXPECT_EQ(host::servedUsers({}), "this host serves its own user only");
    EXPECT_EQ(host::servedUsers({operators, {}}),
              "this host serves root, its own user and the group ops only");
    EXPECT_EQ(host::servedUsers({{}, readers}),
              "this host serves root, its own user and, for reading, the group staff only");
    EXPECT_EQ(host::servedUsers({operators, readers}),
              "this host serves root, its own user, the group ops and, for reading, the group "
              "staff only");
}

}  // namespace
