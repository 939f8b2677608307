#include "fleet/server/keys/tls/server_names.h"

#include <gtest/gtest.h>

#include <string>
#include <vector>

#include "fleet/server/keys/files/keys_error.h"

namespace {

using fleet::checkServerNames;
using fleet::KeysError;

TEST(ServerNames, AreDnsNamesAndAddresses) {
    EXPECT_NO_THROW(checkServerNames({"bus.example", "10.0.0.1", "2001:db8::1", "b-2"}));
    EXPECT_TRUE(fleet::isIpAddress("::1"));
    EXPECT_FALSE(fleet::isIpAddress("1.2.3"));
}

TEST(ServerNames, BeginWithADnsName) {
    EXPECT_THROW(checkServerNames({}), KeysError);
    EXPECT_THROW(checkServerNames({"10.0.0.1", "bus.example"}), KeysError);
}

TEST(ServerNames, HoldNothingThatMeansSomethingToOpenSsl) {
    for (const char* const name :
         {"", "a,DNS:b", "a b", "*", ".a", "a.", "-a", "a..b", "a\nb", "dirName:x"})
        EXPECT_THROW(checkServerNames({"ok", name}), KeysError) << name;
    EXPECT_THROW(checkServerNames({std::string(254, 'a')}), KeysError);
    EXPECT_THROW(checkServerNames(std::vector<std::string>(65, "a")), KeysError);
}

}  // namespace
