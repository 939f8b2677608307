// What the embedded framework does beyond the seam's promises, which the conformance kit checks.

#include "platform/oxa.h"

#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include <unistd.h>

#include <string>

#include "conformance/sample_table.h"
#include "embedded/oxa_host.h"
#include "support/trace_capture.h"

namespace {

class Request : public testing::Test {
protected:
    SampleManager manager;
    SampleRequest request{nullptr, nullptr, &manager};
};

TEST_F(Request, MakesRoomForOneRowWhenOneComes) {
    request.add(sampleRow("a", 1));
    EXPECT_EQ(request.NumRowsAllocated(), 1);
}

/// A table that overrides nothing it need not.
class BareRequest : public rtoxa {
public:
    using rtoxa::rtoxa;
    int TakeSample() override { return OXA_OK; }
};

TEST_F(Request, TheBaseClassPrintsItselfAtDetailLevel) {
    BareRequest bare(nullptr, nullptr, &manager);
    const TraceCapture trace;
    bare.PrintSelf();
    ASSERT_EQ(trace.details("oxa").size(), 1U);
    EXPECT_THAT(
        trace.details("oxa")[0],
        testing::MatchesRegex("rtoxa @0x[0-9a-f]+ <[0-9]+,0> appl=TST,table=SAMPLE,count=0"));
}

TEST_F(Request, TheBaseClassPrintsNothingWhenDetailsAreOff) {
    BareRequest bare(nullptr, nullptr, &manager);
    const TraceCapture trace("ERROR");
    bare.PrintSelf();
    EXPECT_TRUE(trace.lines().empty());
}

TEST(OriginNode, IsTheHostNameUntilItIsSet) {
    char name[256] = "";
    ASSERT_EQ(::gethostname(name, sizeof name - 1), 0);
    EXPECT_EQ(OXA_GetOriginnode(nullptr), std::string(name).substr(0, 64));
}

TEST(OriginNode, IsCutTo64BytesAndOldNamesStayReadable) {
    oxa::setOriginNode("first");
    const char* const first = OXA_GetOriginnode(nullptr);
    oxa::setOriginNode(std::string(100, 'n'));
    EXPECT_EQ(OXA_GetOriginnode(nullptr), std::string(64, 'n'));
    EXPECT_EQ(oxa::originNode(), std::string(64, 'n'));
    EXPECT_STREQ(first, "first");
}

}  // namespace
