#include "ctl/verbs/config/config_set.h"

#include <gtest/gtest.h>

#include "ctl/client/failure.h"

namespace {

using ctl::configurationRequest;

/// What is said on standard error about a request for a product.
std::string noteOn(const std::string& product) {
    testing::internal::CaptureStderr();
    configurationRequest(product, "", "A=1");
    return testing::internal::GetCapturedStderr();
}

TEST(ConfigSet, SendsTheTextAsItIs) {
    const ctl::TaskRequest request = configurationRequest("ux", "a:h:UX", "A=1\nB=2\n");
    EXPECT_EQ(request.command, "SETCONFIG");
    EXPECT_EQ(request.product, "ux");
    EXPECT_EQ(request.targetmsn, "a:h:UX");
    EXPECT_EQ(request.context, "A=1\nB=2\n");
    EXPECT_EQ(request.conditions().size(), 4U);
}

TEST(ConfigSet, RefusesAnEmptyText) {
    EXPECT_THROW(configurationRequest("ux", "", ""), ctl::Failure);
}

TEST(ConfigSet, RefusesATextThatIsNotUtf8BecauseItsLettersWouldBeLost) {
    EXPECT_THROW(configurationRequest("ux", "", "A=gr\xfcn\n"), ctl::Failure);
    EXPECT_EQ(configurationRequest("ux", "", "A=gr\u00fcn\n").context, "A=gr\u00fcn\n");
}

TEST(ConfigSet, NotesThatTheUniversalAgentIsNotChanged) {
    for (const char* product : {"um", "UM", "Um", "uM"}) {
        EXPECT_EQ(
            noteOn(product),
            "zavctl: note: the host changes nothing of the universal agent by this; ua-config "
            "imports metafiles\n");
    }
    EXPECT_EQ(noteOn("ux"), "");
}

}  // namespace
