#include "fleet/server/keys/trust/trust_database.h"

#include <gtest/gtest.h>
#include <sys/stat.h>

#include <filesystem>
#include <string>

#include "fleet/server/keys/files/keys_error.h"
#include "tests/fleet/server/keys/trust/joining.h"

namespace {

namespace fs = std::filesystem;
using fleet::KeysError;
using fleet::TrustDatabase;
using joining::kDay;
using joining::kNow;

class TrustFile : public testing::Test {
protected:
    void expectRefusal(const std::string& words) const {
        const std::string before = scratch_.read("trust.db");
        const std::string said = joining::wordsOf([&] { TrustDatabase database(file_); });
        EXPECT_NE(said.find(words), std::string::npos) << said;
        EXPECT_EQ(scratch_.read("trust.db"), before);
    }

    const ScratchDir scratch_;
    const std::string file_ = scratch_.path("trust.db");
};

TEST_F(TrustFile, IsMadeOnceAndNeverInPlaceOfOneThatIsMissing) {
    EXPECT_NE(joining::wordsOf([&] { TrustDatabase database(file_); }).find("is missing"),
              std::string::npos);
    EXPECT_FALSE(fs::exists(file_));
    TrustDatabase::make(file_);
    EXPECT_THROW(TrustDatabase::make(file_), KeysError);
    EXPECT_NO_THROW(TrustDatabase database(file_));
}

TEST_F(TrustFile, BelongsToItsUserAlone) {
    const mode_t before = ::umask(0);
    TrustDatabase::make(file_);
    fs::permissions(file_, fs::perms(0644));  // as a copy that was put back may be
    TrustDatabase database(file_);
    database.connection().run("DELETE FROM hosts");
    ::umask(before);
    for (const auto& entry : fs::directory_iterator(scratch_.path()))
        EXPECT_EQ(entry.status().permissions(), fs::perms(0600)) << entry.path();
}

TEST_F(TrustFile, CommitsDurably) {
    TrustDatabase::make(file_);
    TrustDatabase database(file_);
    EXPECT_EQ(database.connection().number("PRAGMA synchronous"), 2);
}

TEST_F(TrustFile, IsRefusedWhenItIsNewerOrForeignOrDamaged) {
    TrustDatabase::make(file_);
    sqlite::Database(file_).run("PRAGMA user_version = 99");
    expectRefusal("written by a newer centre");
    sqlite::Database(file_).run("PRAGMA user_version = 1; PRAGMA application_id = 7");
    expectRefusal("is another program's database");
    scratch_.write("trust.db", "this is no database at all, but text of some length", 0600);
    expectRefusal("is damaged");
    scratch_.write("trust.db", "", 0600);
    expectRefusal("is damaged (it has no tables)");
}

TEST(TrustRecords, AreCopiedWhileTheyAreInUseAndCanBePutBack) {
    joining::Fleet made;
    const std::string copy = made.made.scratch().write("copy.db", "older");
    made.made.scratch().write("copy.db.new", "what a copy has left that was cut off");
    made.redeem(joining::Machine().request(made.invite("web1")));
    made.revoked.revokeHost("web1", kNow);
    made.trust.backup(copy);
    made.invite("web2");
    EXPECT_EQ(fs::status(copy).permissions(), fs::perms(0600));
    EXPECT_FALSE(made.made.scratch().exists("copy.db.new"));
    TrustDatabase restored(copy);
    EXPECT_EQ(fleet::RevokedKeys(restored.connection()).hosts(), made.revoked.hosts());
    EXPECT_EQ(made.revoked.hosts().size(), 1U);
    EXPECT_EQ(restored.connection().number("SELECT count(*) FROM hosts"), 1);
}

TEST(TrustRecords, LeaveAnOlderCopyWhenANewOneFails) {
    joining::Fleet made;
    const std::string copy = made.made.scratch().write("copy.db", "older");
    made.made.scratch().write("copy.db.new/in the way", "");
    EXPECT_THROW(made.trust.backup(copy), KeysError);
    EXPECT_EQ(made.made.scratch().read("copy.db"), "older");
    EXPECT_THROW(made.trust.backup(made.made.directory().trustDatabase()), KeysError);
}

TEST(TrustRecords, HoldNoTokenInAnyFile) {
    joining::Fleet made;
    std::string tokens[] = {
        made.invite("web1"), made.invite("web2"),
        made.operators.invite({"anna", fleet::Role::Viewer, {}, {}, "*", kDay}, kDay, kNow)};
    made.redeem(joining::Machine().request(tokens[0]));
    made.login(joining::loginOf(fleet::KeyPair::make(fleet::KeyKind::User), tokens[2]));
    int files = 0;
    for (const auto& entry : fs::recursive_directory_iterator(made.made.scratch().path())) {
        if (!entry.is_regular_file()) continue;
        ++files;
        const std::string content =
            made.made.scratch().read(entry.path().lexically_relative(made.made.scratch().path()));
        for (const std::string& token : tokens)
            EXPECT_EQ(content.find(token), std::string::npos) << entry.path();
    }
    EXPECT_GE(files, 8);
}

TEST(TrustRecords, AreFoundByIndexesWhateverTheFleetsSize) {
    joining::Fleet made;
    const auto planOf = [&](const std::string& statement) {
        sqlite::Statement rows =
            made.trust.connection().ask(("EXPLAIN QUERY PLAN " + statement).c_str());
        std::string plan;
        while (rows.step())
            plan += rows.bytes(3) + "\n";
        return plan;
    };
    for (const char* const statement :
         {"SELECT id FROM hosts WHERE token = x'00'",
          "SELECT count(*) FROM hosts h WHERE name = x'00' AND host IS NOT NULL AND NOT EXISTS "
          "(SELECT 1 FROM revocations r WHERE r.key = h.host)",
          "DELETE FROM hosts WHERE host IS NULL AND expires < 5",
          "SELECT count(*) FROM hosts WHERE host IN (x'00', x'01')",
          "SELECT count(*) FROM hosts WHERE signing IN (x'00', x'01')",
          "SELECT count(*) FROM hosts WHERE host = x'00' OR signing = x'00'",
          "SELECT count(*) FROM revocations WHERE key = x'00'"}) {
        EXPECT_EQ(planOf(statement).find("SCAN"), std::string::npos) << statement << "\n"
                                                                     << planOf(statement);
    }
}

}  // namespace
