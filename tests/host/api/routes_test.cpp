// The host's routes against the page that describes them.
#include "host/api/routes.h"

#include <gtest/gtest.h>

#include <algorithm>
#include <fstream>
#include <sstream>

namespace {

using host::Route;

class Page : public testing::Test {
protected:
    Page() {
        std::ifstream in(ZAV_SOURCE_DIR "/docs/http.md");
        for (std::string line; std::getline(in, line);)
            lines.push_back(line);
    }
    static std::string nameOf(const Route& route) {
        return std::string(route.method) + " " + route.path;
    }
    /// The lines of the section about a route.
    std::vector<std::string> sectionOf(const Route& route) const {
        const auto begin = std::find(lines.begin(), lines.end(), "## " + nameOf(route));
        if (begin == lines.end()) return {};
        return {begin, std::find_if(begin + 1, lines.end(), [](const std::string& line) {
                    return line.rfind("## ", 0) == 0;
                })};
    }
    static bool describes(const std::vector<std::string>& section, const std::string& name) {
        return std::any_of(section.begin(), section.end(), [&](const std::string& line) {
            return line.rfind("| `" + name + "` |", 0) == 0;
        });
    }

    std::vector<std::string> lines;
};

TEST_F(Page, ListsExactlyTheRoutesThatThereAre) {
    std::vector<std::string> expected, found;
    for (const Route& route : host::routes())
        expected.push_back("| `" + nameOf(route) + "` | " + route.doc + " |");
    std::copy_if(lines.begin(), lines.end(), std::back_inserter(found), [](const auto& line) {
        return line.find(" /v1/") != std::string::npos && line.rfind("| `", 0) == 0;
    });
    EXPECT_EQ(found, expected);
}

TEST_F(Page, DescribesEveryParameterAndEveryMember) {
    for (const Route& route : host::routes()) {
        const std::vector<std::string> section = sectionOf(route);
        ASSERT_FALSE(section.empty()) << nameOf(route);
        for (const host::Parameter& parameter : route.parameters)
            EXPECT_TRUE(describes(section, parameter.name)) << parameter.name;
        for (const host::Member& member : route.body)
            EXPECT_TRUE(describes(section, member.name)) << member.name;
    }
}

TEST_F(Page, HasACommandForEveryRoute) {
    for (const Route& route : host::routes()) {
        const std::vector<std::string> section = sectionOf(route);
        const std::string path = route.path;
        const std::string upToParameter = "localhost" + path.substr(0, path.find('{'));
        EXPECT_TRUE(std::any_of(section.begin(), section.end(), [&](const std::string& line) {
            return line.rfind("curl ", 0) == 0 && line.find(upToParameter) != std::string::npos;
        })) << nameOf(route);
    }
}

TEST(RouteRows, SayWhatTheyAreFor) {
    for (const Route& route : host::routes()) {
        EXPECT_NE(route.endpoint, nullptr) << route.path;
        EXPECT_NE(route.doc, std::string()) << route.path;
        for (const host::Parameter& parameter : route.parameters)
            EXPECT_NE(parameter.doc, std::string()) << parameter.name;
        for (const host::Member& member : route.body)
            EXPECT_NE(member.doc, std::string()) << member.name;
    }
}

}  // namespace
