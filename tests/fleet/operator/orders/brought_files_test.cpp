#include "fleet/operator/orders/brought_files.h"

#include <gtest/gtest.h>

#include <filesystem>
#include <fstream>
#include <nlohmann/json.hpp>

#include "ctl/client/failure.h"
#include "tests/fleet/operator/fake_centre.h"
#include "tests/support/scratch_dir.h"

namespace {

using fleet::bringFiles;
using fleet::BroughtFile;
using fleet::filesToBring;
using nlohmann::json;

constexpr const char* kSumOfAbc =
    "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad";

class BroughtFiles : public testing::Test {
protected:
    std::string write(const std::string& name, const std::string& content) const {
        const std::string path = scratch_.path(name);
        std::filesystem::create_directories(std::filesystem::path(path).parent_path());
        std::ofstream(path) << content;
        return path;
    }
    static std::string target(std::size_t size, std::size_t from) {
        return std::string("POST /v1/files/") + kSumOfAbc + "?size=" + std::to_string(size) +
               "&from=" + std::to_string(from);
    }
    static json told(std::size_t have, bool isComplete) {
        return {{"have", have}, {"complete", isComplete}};
    }

    ScratchDir scratch_;
    operator_test::FakeCentre centre_;
    std::vector<std::string> notes_;
};

TEST_F(BroughtFiles, AreNamedAndSummed) {
    const std::vector<BroughtFile> files = filesToBring(write("ux.tar", "abc"), "ux/7.1/", notes_);
    ASSERT_EQ(files.size(), 1U);
    EXPECT_EQ(files[0].file.path, "ux/7.1/ux.tar");
    EXPECT_EQ(files[0].file.sha256, kSumOfAbc);
    EXPECT_EQ(files[0].file.size, 3U);
}

TEST_F(BroughtFiles, AreThoseOfAFolder) {
    write("bundle/a", "abc");
    write("bundle/b/c", "abc");
    const std::vector<BroughtFile> files = filesToBring(scratch_.path("bundle"), "ux", notes_);
    ASSERT_EQ(files.size(), 2U);
    EXPECT_EQ(files[0].file.path, "ux/a");
    EXPECT_EQ(files[1].file.path, "ux/b/c");
}

TEST_F(BroughtFiles, ThatAreNotThereOrWouldLeaveTheDepotAreAMistake) {
    EXPECT_THROW(filesToBring(scratch_.path("nothing"), "", notes_), ctl::Failure);
    EXPECT_THROW(filesToBring(write("a", "abc"), "../a", notes_), ctl::Failure);
}

TEST_F(BroughtFiles, AreSentFromWhereTheCentreHasThem) {
    const std::vector<BroughtFile> files = filesToBring(write("a", "abc"), "", notes_);
    centre_.answer(target(3, 0), told(1, false));
    centre_.answer(target(3, 1), told(3, true));
    bringFiles(centre_, files);
    ASSERT_EQ(centre_.asked().size(), 2U);
    EXPECT_EQ(centre_.asked()[0].body, "");
    EXPECT_EQ(centre_.asked()[1].body, "bc");
}

TEST_F(BroughtFiles, ThatAreThereAreNotSentAgain) {
    const std::vector<BroughtFile> files = filesToBring(write("a", "abc"), "", notes_);
    centre_.answer(target(3, 0), told(3, true));
    bringFiles(centre_, files);
    EXPECT_EQ(centre_.asked().size(), 1U);
}

TEST_F(BroughtFiles, OfWhichTheCentreTakesNothingAreAFailure) {
    const std::vector<BroughtFile> files = filesToBring(write("a", "abc"), "", notes_);
    centre_.answer(target(3, 0), told(0, false));
    EXPECT_THROW(bringFiles(centre_, files), ctl::Failure);
}

TEST_F(BroughtFiles, ThatBecomeShorterAreAFailure) {
    const std::vector<BroughtFile> files = filesToBring(write("a", "abc"), "", notes_);
    write("a", "a");
    centre_.answer(target(3, 0), told(0, false));
    EXPECT_THROW(bringFiles(centre_, files), ctl::Failure);
}

}  // namespace
