// Which interface is found under an identifier and a version, and what registering changes.
#include "ncs/registry.h"

#include <gtest/gtest.h>

#include <cstdint>

namespace {

constexpr uuid__t kId = {0x12345678, 0x9abc, 0, 2, {1, 2, 3, 4, 5, 6, 7}};
constexpr uuid__t kOtherId = {0x12345678, 0x9abc, 0, 2, {1, 2, 3, 4, 5, 6, 8}};
constexpr rpc__if_spec kInterface = {"registered", kId, 3, 0};
constexpr rpc__server_epv kStubs = {nullptr, 0};

std::uint32_t registerWith(const void* manager, const uuid__t& object = uuid__nil,
                           const rpc__server_epv& stubs = kStubs) {
    std::uint32_t status = 0xFFFFFFFF;
    rpc__register_mgr(&object, &kInterface, &stubs, manager, &status);
    return status;
}

TEST(Registry, FindsAnInterfaceByItsIdentifierAndVersion) {
    const int manager = 0;
    ASSERT_EQ(registerWith(&manager), rpc__s_ok);
    ncs::RegisteredInterface found;
    ASSERT_TRUE(ncs::findInterface(kId, 3, found));
    EXPECT_EQ(found.interface, &kInterface);
    EXPECT_EQ(found.stubs, &kStubs);
    EXPECT_EQ(found.manager, &manager);
}

TEST(Registry, FindsNoOtherVersionOrIdentifier) {
    ASSERT_EQ(registerWith(nullptr), rpc__s_ok);
    ncs::RegisteredInterface found;
    EXPECT_FALSE(ncs::findInterface(kId, 2, found));
    EXPECT_FALSE(ncs::findInterface(kOtherId, 3, found));
    EXPECT_EQ(found.interface, nullptr);
}

TEST(Registry, ASecondRegistrationReplacesTheFirst) {
    const int first = 0;
    const int second = 0;
    ASSERT_EQ(registerWith(&first), rpc__s_ok);
    const unsigned count = ncs::registeredCount();
    ASSERT_EQ(registerWith(&second), rpc__s_ok);
    EXPECT_EQ(ncs::registeredCount(), count);
    ncs::RegisteredInterface found;
    ASSERT_TRUE(ncs::findInterface(kId, 3, found));
    EXPECT_EQ(found.manager, &second);
}

TEST(Registry, TakesNoManagersOfObjectsNorStubsOfAnotherCount) {
    const unsigned count = ncs::registeredCount();
    EXPECT_EQ(registerWith(nullptr, kOtherId), rpc__s_unknown_if);
    EXPECT_EQ(registerWith(nullptr, uuid__nil, rpc__server_epv{nullptr, 1}), rpc__s_unknown_if);
    EXPECT_EQ(ncs::registeredCount(), count);
}

}  // namespace
