// The meanings of statuses against the page that lists them.
#include "host/api/statuses.h"

#include <gtest/gtest.h>

#include <fstream>
#include <string>

namespace {

TEST(Statuses, AreThoseOfThePage) {
    std::ifstream in(ZAV_SOURCE_DIR "/docs/http.md");
    std::vector<std::string> found, expected;
    for (std::string line; std::getline(in, line);) {
        const bool isRow = line.size() > 6 && line.rfind("| ", 0) == 0 &&
                           line.find_first_not_of("0123456789", 2) == 5 && line[5] == ' ';
        if (isRow) found.push_back(line);
    }
    for (const host::StatusMeaning& meaning : host::statusMeanings())
        expected.push_back("| " + std::to_string(meaning.status) + " | " + meaning.when + " |");
    EXPECT_EQ(found, expected);
}

}  // namespace
