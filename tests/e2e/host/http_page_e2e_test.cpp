// docs/http.md against a real host: every command on the page runs and answers as the page says.
// ctest-label: threaded

#include <gtest/gtest.h>
#include <signal.h>

#include <filesystem>
#include <fstream>
#include <memory>
#include <sstream>
#include <vector>

#include "support/host/managed_host.h"
#include "support/host/script_home.h"

namespace {

struct Example {
    std::string command;  ///< for a shell
    std::string answer;   ///< "..." stands for any text
    bool isStream() const { return command.find("curl -sN ") == 0; }
};

/// The page's blocks of commands, each with the block of the answer behind it.
std::vector<Example> examplesOf(const std::string& path) {
    std::ifstream in(path);
    std::vector<Example> examples;
    std::string* block = nullptr;
    for (std::string line; std::getline(in, line);) {
        if (line.rfind("```", 0) != 0) {
            if (block != nullptr) *block += line + "\n";
        } else if (block != nullptr) {
            block = nullptr;
        } else if (line == "```sh") {
            examples.emplace_back();
            block = &examples.back().command;
        } else if (!examples.empty()) {
            block = &examples.back().answer;
        }
    }
    return examples;
}

/// Whether the text has the pattern's form. Only the pieces between "..." are looked for, each
/// behind the one before it, the first at the beginning and the last at the end.
bool matches(const std::string& text, const std::string& pattern) {
    const std::string any = "...";
    std::vector<std::string> pieces;
    for (std::size_t from = 0; from != std::string::npos;) {
        const std::size_t end = pattern.find(any, from);
        pieces.push_back(pattern.substr(from, end - from));
        from = end == std::string::npos ? end : end + any.size();
    }
    if (pieces.size() == 1) return text == pattern;
    if (text.rfind(pieces.front(), 0) != 0) return false;
    std::size_t at = pieces.front().size();
    for (std::size_t i = 1; i + 1 < pieces.size(); ++i) {
        at = text.find(pieces[i], at);
        if (at == std::string::npos) return false;
        at += pieces[i].size();
    }
    const std::string& last = pieces.back();
    return text.size() >= at + last.size() &&
           text.compare(text.size() - last.size(), last.size(), last) == 0;
}

/// What a stream has sent, without the comments that show that the host is alive.
std::string withoutHeartbeats(std::string stream) {
    const std::string heartbeat = ":\n\n";
    for (std::size_t at = 0; (at = stream.find(heartbeat, at)) != std::string::npos;) {
        if (at == 0 || stream[at - 1] == '\n') {
            stream.erase(at, heartbeat.size());
        } else {
            ++at;
        }
    }
    return stream;
}

TEST(HttpPagePatterns, CompareTheWholeText) {
    EXPECT_TRUE(matches("a\n", "a\n"));
    EXPECT_FALSE(matches("ab\n", "a\n"));
    EXPECT_FALSE(matches("xa\n", "a\n"));
    EXPECT_TRUE(matches("a1b2c\n", "a...b...c\n"));
    EXPECT_FALSE(matches("a1b2\n", "a...b...c\n"));
    EXPECT_FALSE(matches("a1c2b\n", "a...b...c\n"));
}

class HttpPage : public testing::Test {
protected:
    std::vector<std::string> shell(const std::string& command) const {
        return {"/bin/sh", "-c", "exec " + command};
    }
    Environment environment() const { return {{"ZAV_SOCKET", host.socket()}}; }
    bool subscribed(std::size_t streams) const {
        return host.exchange("GET /v1/health HTTP/1.0\r\n\r\n")
                   .find("\"subscriptions\":" + std::to_string(streams)) != std::string::npos;
    }

    ScriptHome home;
    ManagedHost host{
        home.path(), {{"QVSDEPLOY_AGENTDEPOT", home.depot()}}, {}, ManagedHost::Guards::On};
};

TEST_F(HttpPage, EveryCommandAnswersAsThePageSays) {
    home.products({"ux"}, "exit 0");
    home.files().write("depot/ux/7.1/notes", "abc");
    const std::string lister = home.path() + "/bin/instances";
    std::ofstream(lister)
        << "#!/bin/sh\nprintf 'um\\t\\t\\tstopped\\t\\nux\\t\\t\\tstopped\\t\\n'\n";
    std::filesystem::permissions(lister, std::filesystem::perms::owner_all);
    std::vector<std::pair<Example, std::unique_ptr<Program>>> streams;
    const std::vector<Example> examples = examplesOf(ZAV_SOURCE_DIR "/docs/http.md");
    EXPECT_GE(examples.size(), 7U);
    for (const Example& example : examples) {
        SCOPED_TRACE(example.command);
        ASSERT_NE(example.answer, "");
        if (example.isStream()) {
            streams.emplace_back(
                example, std::make_unique<Program>(shell(example.command), "", environment()));
            ASSERT_TRUE(eventually([&] { return subscribed(streams.size()); }));
            continue;
        }
        const ProgramResult result = runProgram(shell(example.command), "", environment());
        EXPECT_EQ(result.status, 0) << result.err;
        EXPECT_TRUE(matches(result.out, example.answer)) << result.out;
    }
    EXPECT_EQ(streams.size(), 2U);
    for (const auto& [example, program] : streams) {
        SCOPED_TRACE(example.command);
        std::string events;
        EXPECT_TRUE(eventually([&events, &stream = *program] {
            events = withoutHeartbeats(stream.out());
            return events.find("\n\n") != std::string::npos || !stream.running();
        })) << program->err();
        EXPECT_TRUE(matches(events, example.answer + "\n")) << events;
        program->signal(SIGTERM);
        program->wait();
    }
}

}  // namespace
