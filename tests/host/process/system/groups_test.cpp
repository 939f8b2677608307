#include "host/process/system/groups.h"

#include <grp.h>
#include <gtest/gtest.h>

#include "host/process/start_error.h"

namespace {

TEST(NamedGroups, AreFoundByTheirNames) {
    const group* const root = ::getgrgid(0);
    ASSERT_NE(root, nullptr);
    const std::string name = root->gr_name;
    const host::Group found = host::groupNamed("--group", name);
    EXPECT_EQ(found.number, 0U);
    EXPECT_EQ(found.name, name);
}

TEST(NamedGroups, MustExist) {
    try {
        host::groupNamed("--read-only-group", "no-such-group");
        FAIL();
    } catch (const host::StartError& error) {
        EXPECT_STREQ(error.what(), "--read-only-group: there is no group \"no-such-group\"");
    }
    EXPECT_THROW(host::groupNamed("--group", ""), host::StartError);
}

TEST(NamedGroups, AreNoneUnlessOneIsNamed) {
    EXPECT_FALSE(host::AccessGroups().any());
    EXPECT_TRUE((host::AccessGroups{host::Group{"a", 1}, {}}).any());
    EXPECT_TRUE((host::AccessGroups{{}, host::Group{"a", 1}}).any());
}

}  // namespace
