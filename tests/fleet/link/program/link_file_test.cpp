#include "fleet/link/program/link_file.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <string>

#include "fleet/files/file_error.h"
#include "fleet/link/program/machine.h"
#include "support/scratch_dir.h"

namespace {

using fleet::FileError;
using fleet::Kept;
using fleet::KeyKind;
using fleet::KeyPair;
using fleet::LinkFile;
using fleet::Moment;

class LinksFile : public testing::Test {
protected:
    void create() const { LinkFile::create(scratch.path(), bus, signing, "a.token"); }

    ScratchDir scratch;
    const KeyPair bus = KeyPair::make(KeyKind::User);
    const KeyPair signing = KeyPair::make(KeyKind::User);
};

TEST_F(LinksFile, HasTheKeysAndNothingTakenAtFirst) {
    create();
    const LinkFile file(scratch.path());
    EXPECT_EQ(file.bus().publicKey(), bus.publicKey());
    EXPECT_EQ(file.signing().publicKey(), signing.publicKey());
    EXPECT_EQ(file.token(), "a.token");
    EXPECT_EQ(file.kept(), Kept{});
}

TEST_F(LinksFile, RemembersWhatIsKept) {
    create();
    Kept kept;
    kept.taken = 12;
    kept.journal = "journal";
    kept.adopted = Moment(5);
    kept.latest = Moment(6);
    LinkFile(scratch.path()).keep(kept);
    const LinkFile again(scratch.path());
    EXPECT_EQ(again.kept(), kept);
    EXPECT_EQ(again.bus().publicKey(), bus.publicKey());
    EXPECT_EQ(again.token(), "a.token");
}

TEST_F(LinksFile, BelongsToOneProcessAtATime) {
    create();
    const LinkFile file(scratch.path());
    EXPECT_THROW(LinkFile{scratch.path()}, FileError);
}

TEST_F(LinksFile, IsForItsUserOnly) {
    create();
    LinkFile(scratch.path()).keep({});
    struct stat found {};
    ASSERT_EQ(::stat(scratch.path("link.json").c_str(), &found), 0);
    EXPECT_EQ(found.st_mode & 07777U, 0600U);
    ::chmod(scratch.path("link.json").c_str(), 0644);
    EXPECT_THROW(LinkFile{scratch.path()}, FileError);
}

TEST_F(LinksFile, AHostIsEnrolledOnce) {
    create();
    EXPECT_THROW(create(), FileError);
    EXPECT_EQ(LinkFile(scratch.path()).bus().publicKey(), bus.publicKey());
}

TEST_F(LinksFile, WhatIsNoneIsRefusedWithAWayOut) {
    EXPECT_THROW(LinkFile{scratch.path()}, FileError);
    for (const char* const text :
         {"", "{}", R"({"bus":"x","signing":"y","token":"","taken":0})", "[1]"}) {
        scratch.write("link.json", text, 0600);
        try {
            const LinkFile file(scratch.path());
            FAIL() << text;
        } catch (const FileError& error) {
            EXPECT_NE(std::string(error.what()).find("enrol the host anew"), std::string::npos);
        }
    }
}

TEST(Machine, TheSameOneIsAnotherForAnotherHostAndNeverNamed) {
    const ScratchDir scratch;
    const std::string file = scratch.write("machine-id", "0123456789abcdef\n");
    const std::string machine = fleet::machineIdentity("UHOST", file);
    EXPECT_EQ(machine.size(), 64U);
    EXPECT_EQ(fleet::machineIdentity("UHOST", file), machine);
    EXPECT_NE(fleet::machineIdentity("UOTHER", file), machine);
    EXPECT_EQ(machine.find("0123456789abcdef"), std::string::npos);
    EXPECT_EQ(fleet::machineIdentity("UHOST", scratch.path("none")), "");
}

}  // namespace
