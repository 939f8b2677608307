#include "host/depot/depot.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include "host/depot/depot_error.h"
#include "support/scratch_dir.h"

namespace {

using host::Depot;
using host::DepotEntry;
using host::DepotError;
using Kind = host::DepotError::Kind;

class ADepot : public testing::Test {
protected:
    ADepot() {
        scratch_.makeDir("depot");
        scratch_.write("secret", "outside");
        scratch_.write("depot/ux/7.1/a", "12345");
        scratch_.write("depot/b", "");
        link("ux/7.1", "depot/current");
        link("../secret", "depot/escape");
        link(scratch_.path("secret"), "depot/absolute");
        EXPECT_EQ(::mkfifo(scratch_.path("depot/pipe").c_str(), 0600), 0);
        scratch_.write("depot/zavhost/journal", "the host's");
    }
    void link(const std::string& target, const std::string& name) const {
        ASSERT_EQ(::symlink(target.c_str(), scratch_.path(name).c_str()), 0);
    }
    /// Why the work is refused.
    template <typename Work>
    static Kind refusalOf(Work work) {
        try {
            work();
        } catch (const DepotError& error) {
            return error.kind();
        }
        ADD_FAILURE() << "not refused";
        return Kind::Failed;
    }
    Kind listRefusal(const std::string& path) const {
        return refusalOf([&] { depot_.list(path); });
    }
    Kind sumRefusal(const std::string& path) const {
        return refusalOf([&] { depot_.sum(path); });
    }
    Kind removeRefusal(const std::string& path, bool recursive = true) const {
        return refusalOf([&] { depot_.remove(path, recursive); });
    }
    std::string namesIn(const std::string& path) const {
        std::string names;
        for (const DepotEntry& entry : depot_.list(path).entries)
            names += entry.name + " ";
        return names;
    }

    ScratchDir scratch_;
    Depot depot_{scratch_.path("depot"), {scratch_.path("depot/zavhost")}};
};

TEST_F(ADepot, ListsWhatADirectoryHolds) {
    const host::DepotListing listing = depot_.list("");
    EXPECT_TRUE(listing.complete);
    EXPECT_EQ(listing.self.type, DepotEntry::Type::Directory);
    EXPECT_EQ(namesIn(""), "absolute b current escape pipe ux zavhost ");
    EXPECT_EQ(listing.entries[0].type, DepotEntry::Type::Link);
    EXPECT_EQ(listing.entries[1].type, DepotEntry::Type::File);
    EXPECT_EQ(listing.entries[4].type, DepotEntry::Type::Other);
    EXPECT_EQ(listing.entries[5].type, DepotEntry::Type::Directory);
    EXPECT_EQ(namesIn("ux/7.1"), "a ");
    EXPECT_EQ(namesIn("/ux/"), "7.1 ");
    EXPECT_EQ(namesIn("current"), "a ") << "a link that stays inside";
}

TEST_F(ADepot, ListsAFileAsItself) {
    const host::DepotListing listing = depot_.list("ux/7.1/a");
    EXPECT_EQ(listing.self.name, "a");
    EXPECT_EQ(listing.self.bytes, 5U);
    EXPECT_TRUE(listing.entries.empty());
    EXPECT_EQ(depot_.list("escape").self.type, DepotEntry::Type::Link) << "one that leads out";
}

TEST_F(ADepot, HoldsNothingThatLeadsOut) {
    for (const char* path : {"..", "../secret", "ux/../../secret"}) {
        EXPECT_EQ(listRefusal(path), Kind::LeadsOut) << path;
        EXPECT_EQ(sumRefusal(path), Kind::LeadsOut) << path;
    }
    EXPECT_EQ(removeRefusal("../secret"), Kind::LeadsOut);
    for (const char* path : {"escape", "absolute"})
        EXPECT_EQ(sumRefusal(path), Kind::LeadsOut) << path;
    EXPECT_TRUE(scratch_.exists("secret"));
}

TEST_F(ADepot, KeepsTheHostsOwnFilesToItself) {
    link("zavhost", "depot/alias");
    for (const char* path : {"zavhost/journal", "alias/journal"}) {
        EXPECT_EQ(sumRefusal(path), Kind::Forbidden) << path;
        EXPECT_EQ(removeRefusal(path), Kind::Forbidden) << path;
    }
    EXPECT_EQ(listRefusal("zavhost"), Kind::Forbidden);
    EXPECT_EQ(removeRefusal("zavhost"), Kind::Forbidden);
    depot_.remove("alias", false);
    EXPECT_TRUE(scratch_.exists("depot/zavhost/journal"));
}

TEST_F(ADepot, KeepsADirectoryThatHoldsTheHostsOwnFiles) {
    const Depot depot(scratch_.path("depot"), {scratch_.path("depot/ux/7.1")});
    EXPECT_EQ(refusalOf([&] { depot.remove("ux", true); }), Kind::Forbidden);
    EXPECT_TRUE(scratch_.exists("depot/ux/7.1/a"));
}

TEST_F(ADepot, SumsFiles) {
    EXPECT_EQ(depot_.sum("ux/7.1/a").sha256,
              "5994471abb01112afcc18159f6cc74b4f511b99806da59b3caf5a9c173cacfc5");
    EXPECT_EQ(depot_.sum("current/a").bytes, 5U);
    EXPECT_EQ(sumRefusal("ux"), Kind::WrongKind);
    EXPECT_EQ(sumRefusal("pipe"), Kind::WrongKind) << "and does not wait for a writer";
    EXPECT_EQ(sumRefusal("none"), Kind::NotThere);
}

TEST_F(ADepot, RemovesFilesAndLinks) {
    depot_.remove("b", false);
    depot_.remove("escape", false);
    depot_.remove("current", true);
    depot_.remove("pipe", false);
    EXPECT_EQ(namesIn(""), "absolute ux zavhost ");
    EXPECT_TRUE(scratch_.exists("secret"));
    EXPECT_TRUE(scratch_.exists("depot/ux/7.1/a"));
    EXPECT_EQ(removeRefusal("b"), Kind::NotThere);
}

TEST_F(ADepot, RemovesDirectoriesOnlyWhenAskedTo) {
    EXPECT_EQ(removeRefusal("ux", false), Kind::WrongKind);
    depot_.remove("ux/", true);
    EXPECT_FALSE(scratch_.exists("depot/ux"));
}

TEST_F(ADepot, IsNotRemovedItself) {
    for (const char* path : {"", "/", ".", "ux/..", "./"})
        EXPECT_EQ(removeRefusal(path), Kind::WrongKind) << path;
    EXPECT_TRUE(scratch_.exists("depot/b"));
}

TEST_F(ADepot, CutsAListingThatIsTooLong) {
    const Depot small(scratch_.path("depot"), {}, 3);
    for (const char* name : {"many/a", "many/b", "many/c"})
        scratch_.write(std::string("depot/") + name, "");
    EXPECT_TRUE(small.list("many").complete);
    scratch_.write("depot/many/d", "");
    EXPECT_FALSE(small.list("many").complete);
    EXPECT_EQ(small.list("many").entries.size(), 3U);
}

TEST(ADepotThatIsMissing, SaysSo) {
    const Depot depot("/nowhere/depot");
    try {
        depot.list("");
        FAIL();
    } catch (const DepotError& error) {
        EXPECT_EQ(error.kind(), Kind::Failed);
        EXPECT_EQ(std::string(error.what()),
                  "the depot /nowhere/depot cannot be opened: No such file or directory");
    }
    EXPECT_THROW(depot.freeBytes(), DepotError);
}

}  // namespace
