#include "host/depot/checksum.h"

#include <fcntl.h>
#include <gtest/gtest.h>

#include <system_error>

#include "support/scratch_dir.h"
#include "system/file_descriptor.h"

namespace {

host::Checksum sumOf(const std::string& content) {
    const ScratchDir scratch;
    const std::string path = scratch.write("file", content);
    return host::checksumOf(sys::FileDescriptor(::open(path.c_str(), O_RDONLY)).get());
}

TEST(Checksum, IsTheOneOfTheStandard) {
    EXPECT_EQ(sumOf("").sha256, "e3b0c44298fc1c149afbf4c8996fb92427ae41e4649b934ca495991b7852b855");
    EXPECT_EQ(sumOf("abc").sha256,
              "ba7816bf8f01cfea414140de5dae2223b00361a396177a9cb410ff61f20015ad");
    EXPECT_EQ(sumOf(std::string(1'000'000, 'a')).sha256,
              "cdc76e5c9914fb9281a1c7e284d73e67f1809a48a497200e046d39ccc7112cd0");
}

TEST(Checksum, CountsTheBytes) {
    EXPECT_EQ(sumOf("").bytes, 0U);
    EXPECT_EQ(sumOf(std::string(300'000, 'x')).bytes, 300'000U);
}

TEST(Checksum, OfWhatCannotBeReadIsAnError) {
    EXPECT_THROW(host::checksumOf(-1), std::system_error);
}

}  // namespace
