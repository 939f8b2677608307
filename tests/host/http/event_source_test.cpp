#include "host/http/event_source.h"

#include <gtest/gtest.h>

namespace {

std::string text(const host::Event& event) {
    std::string out = "before\n\n";
    host::appendEvent(out, event);
    return out.substr(8);
}

TEST(EventText, HasOnlyTheFieldsThatAreGiven) {
    EXPECT_EQ("data: {}\n\n", text({"{}", {}, {}}));
    EXPECT_EQ("id: j-7\nevent: gap\ndata: {}\n\n", text({"{}", "gap", "j-7"}));
}

TEST(EventText, HasOneFieldForEachLineOfItsData) {
    EXPECT_EQ("data: a\ndata: \ndata: b\n\n", text({"a\n\nb", {}, {}}));
    EXPECT_EQ("data: \n\n", text({"", {}, {}}));
}

}  // namespace
