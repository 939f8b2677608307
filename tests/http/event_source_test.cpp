#include "http/event_source.h"

#include <gtest/gtest.h>

namespace {

std::string text(const http::Event& event) {
    std::string out = "before\n\n";
    http::appendEvent(out, event);
    return out.substr(8);
}

TEST(EventText, HasOnlyTheFieldsThatAreGiven) {
    EXPECT_EQ(text({"{}", {}, {}}), "data: {}\n\n");
    EXPECT_EQ(text({"{}", "gap", "j-7"}), "id: j-7\nevent: gap\ndata: {}\n\n");
}

TEST(EventText, HasOneFieldForEachLineOfItsData) {
    EXPECT_EQ(text({"a\n\nb", {}, {}}), "data: a\ndata: \ndata: b\n\n");
    EXPECT_EQ(text({"", {}, {}}), "data: \n\n");
}

}  // namespace
