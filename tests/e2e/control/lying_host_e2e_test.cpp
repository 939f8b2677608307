// ctest-label: threaded
//
// zavctl believes nothing that a host says. Whatever it is, zavctl ends with an error that says
// why, obeys no escape sequence in it, and takes no more memory than its limits allow.

#include <gmock/gmock.h>
#include <sys/resource.h>

#include <algorithm>
#include <cctype>

#include "ctl/client/lying_host.h"
#include "support/host/managed_host.h"

namespace {

using ctl_test::LyingHost;
using ctl_test::Victim;
using testing::AnyOf;
using testing::HasSubstr;
using Words = std::vector<std::string>;

/// The sanitizers take memory of their own.
#if defined(__SANITIZE_ADDRESS__) || defined(__SANITIZE_THREAD__)
constexpr long kMostKiB = 4L << 20;
#else
constexpr long kMostKiB = 400L << 10;
#endif

/// Of seconds, for what does not wait for a time-out, however busy the machine is.
const char* const kTimeEnough = "50";

ProgramResult ask(const LyingHost& host, const Words& verb,
                  const std::string& timeout = kTimeEnough) {
    Words line = {zavctlPath(), "--socket", host.path(), "--timeout", timeout};
    line.insert(line.end(), verb.begin(), verb.end());
    return runProgram(line);
}

/// Holds for everything that zavctl ever prints and however it ends.
void expectHarmless(const ProgramResult& result) {
    const auto isControl = [](char c) {
        return c != '\n' && (static_cast<unsigned char>(c) < 0x20 || c == 0x7F);
    };
    for (const std::string& text : {result.out, result.err}) {
        EXPECT_TRUE(std::none_of(text.begin(), text.end(), isControl)) << text;
        EXPECT_EQ(text.find("\xc2\x9b"), std::string::npos) << text;
        EXPECT_EQ(text.find("json.exception"), std::string::npos) << "not our own words: " << text;
    }
    EXPECT_LT(result.status, 128);
    rusage used{};
    ::getrusage(RUSAGE_CHILDREN, &used);
    EXPECT_LT(used.ru_maxrss, kMostKiB);
}

std::string ok(const std::string& body, const std::string& fields = "") {
    return "HTTP/1.1 200 OK\r\nContent-Length: " + std::to_string(body.size()) + "\r\n" + fields +
           "\r\n" + body;
}

std::string chunked(const std::string& chunks) {
    return "HTTP/1.1 200 OK\r\nTransfer-Encoding: chunked\r\n\r\n" + chunks;
}

std::string repeated(const std::string& text, std::size_t times) {
    std::string all;
    all.reserve(text.size() * times);
    for (std::size_t i = 0; i < times; ++i)
        all += text;
    return all;
}

LyingHost::Lie saying(const std::string& bytes) {
    return [bytes](const Victim& victim) {
        victim.hear();
        victim.send(bytes);
    };
}

LyingHost::Lie answering(const std::string& document) {
    return saying(ok(document));
}

/// The document is made when it is asked for, because it is large.
LyingHost::Lie answeringAtLength(std::string (*document)()) {
    return [document](const Victim& victim) {
        victim.hear();
        victim.send(ok(document()));
    };
}

// ---- Answers that no verb can use ---------------------------------------------------------------

struct Lie {
    const char* name;
    LyingHost::Lie tell;
    const char* said;  ///< by zavctl agents
};

std::vector<Lie> answersThatAreNone() {
    return {
        {"nothing at all", [](const Victim&) {}, "the connection to the host at "},
        {"another protocol", saying("SSH-2.0-server\r\n"), "the connection to the host at "},
        {"half a head", saying("HTTP/1.1 200 OK\r\nContent-"), "the connection to the host at "},
        {"a status without a body", saying("HTTP/1.1 200 OK\r\nContent-Length: 0\r\n\r\n"),
         "the host's answer is no JSON"},
        {"a redirection", saying("HTTP/1.1 302 Found\r\nLocation: /\r\nContent-Length: 0\r\n\r\n"),
         "it answers with status 302"},
        {"only promises", saying(repeated("HTTP/1.1 100 Continue\r\n\r\n", 10000)),
         "it answers with status 100"},
        {"truncated JSON", answering(R"({"rows": [{"PRODUCT": "u)"), "is no JSON"},
        {"a body shorter than its length",
         saying("HTTP/1.1 200 OK\r\nContent-Length: 100\r\n\r\n{\"rows\": []}"),
         "the connection to the host at "},
        {"a body longer than its length",
         saying("HTTP/1.1 200 OK\r\nContent-Length: 5\r\n\r\n{\"rows\": []}"), "is no JSON"},
        {"a negative length", saying("HTTP/1.1 200 OK\r\nContent-Length: -5\r\n\r\n{}"),
         "the connection to the host at "},
        {"a huge length",
         saying("HTTP/1.1 200 OK\r\nContent-Length: 9223372036854775807\r\n\r\n{}"),
         "is larger than 64 MiB"},
        {"two lengths",
         saying("HTTP/1.1 200 OK\r\nContent-Length: 2\r\nContent-Length: 12\r\n\r\n{\"rows\": []}"),
         "the connection to the host at "},
        {"a chunk of no size", saying(chunked("zz\r\n{}\r\n0\r\n\r\n")),
         "the connection to the host at "},
        {"a chunk of a huge size", saying(chunked("ffffffffffffffff\r\n{}")), "the "},
        {"a chunk that is cut", saying(chunked("50\r\n{\"rows\"")),
         "the connection to the host at "},
        {"a head without end",
         [](const Victim& victim) {
             victim.hear();
             victim.send("HTTP/1.1 200 OK\r\n");
             victim.sendWithoutEnd("X-Filler: filler\r\n");
         },
         "the connection to the host at "},
        {"a field without end",
         [](const Victim& victim) {
             victim.hear();
             victim.send("HTTP/1.1 200 OK\r\nX-Filler: ");
             victim.sendWithoutEnd(std::string(65536, 'x'));
         },
         "the connection to the host at "},
        {"a body without end",
         [](const Victim& victim) {
             victim.hear();
             victim.send("HTTP/1.1 200 OK\r\nConnection: close\r\n\r\n");
             victim.sendWithoutEnd(std::string(65536, ' '));
         },
         "is larger than 64 MiB"},
        {"chunks without end",
         [](const Victim& victim) {
             victim.hear();
             victim.send(chunked(""));
             victim.sendWithoutEnd("1000\r\n" + std::string(4096, ' ') + "\r\n");
         },
         "is larger than 64 MiB"},
        {"a chunk extension without end",
         [](const Victim& victim) {
             victim.hear();
             victim.send(chunked("1;"));
             victim.sendWithoutEnd(std::string(65536, 'x'));
         },
         "the connection to the host at "},
        {"nested lists", answeringAtLength([] { return std::string(200'000, '['); }),
         "nested deeper than 100 levels"},
        {"nested objects", answeringAtLength([] { return repeated("{\"a\":", 200'000); }),
         "nested deeper than 100 levels"},
        {"more rows than anybody has",
         answeringAtLength([] { return "{\"rows\": [" + repeated("{},", 1'000'200) + "{}]}"; }),
         "has more than 1,000,000 rows"},
        {"more members than anybody has",
         answeringAtLength([] { return "{" + repeated("\"a\":1,", 6'000'000) + "\"b\":1}"; }),
         "has more than 1,000,000 members"},
        {"raw NUL bytes", answering(std::string("{\"rows\": [\0]}", 13)), "is no JSON"},
        {"text that is no UTF-8", answering("{\"rows\": [{\"PRODUCT\": \"\xff\xfe\"}]}"),
         "is no JSON"},
        {"a number that no computer holds", answering(R"({"rows": [{"RETVAL": 1e999999}]})"),
         "is no JSON"},
        {"escape sequences instead of JSON", answering("\x1b[2J\x1b]0;title\x07"), "is no JSON"},
        {"a refusal with escape sequences",
         saying("HTTP/1.1 503 \x1b[2J\r\nContent-Length: 31\r\n\r\n"
                R"({"error": "\u001b[2J \u009b1m"})"),
         "the "},
    };
}

/// One case for each lie: together they take long.
class LyingHostWhoseAnswerIsNone : public testing::TestWithParam<Lie> {};

/// "NestedLists" of "nested lists".
std::string caseName(const testing::TestParamInfo<Lie>& tested) {
    std::string name;
    bool begins = true;
    for (const char* c = tested.param.name; *c != '\0'; ++c) {
        const auto letter = static_cast<unsigned char>(*c);
        if (std::isalnum(letter) != 0) {
            name += static_cast<char>(begins ? std::toupper(letter) : letter);
        }
        begins = std::isalnum(letter) == 0;
    }
    return name;
}

INSTANTIATE_TEST_SUITE_P(Saying, LyingHostWhoseAnswerIsNone,
                         testing::ValuesIn(answersThatAreNone()), caseName);

TEST_P(LyingHostWhoseAnswerIsNone, IsAFailureOfEveryVerb) {
    const Words verbs[] = {{"agents"},
                           {"status"},
                           {"query", "KINAGT"},
                           {"start", "ux"},
                           {"config", "get", "ux"},
                           {"complete-install"},
                           {"depot", "ls"},
                           {"depot", "rm", "file"},
                           {"doctor"},
                           {"ps"},
                           {"top"},
                           {"tasks"},
                           {"task", "show", "T"},
                           {"task", "cancel", "T"},
                           {"events", "--count", "1"}};
    const Lie& lie = GetParam();
    const LyingHost host(lie.tell);
    for (const Words& verb : verbs) {
        SCOPED_TRACE(verb.front());
        const ProgramResult result = ask(host, verb, kTimeEnough);
        expectHarmless(result);
        EXPECT_THAT(result.status, AnyOf(1, 3, 4)) << result.err;
        EXPECT_THAT(result.err, testing::StartsWith("zavctl: "));
        if (verb.front() == "agents") {
            EXPECT_THAT(result.err, HasSubstr(lie.said));
        }
    }
}

TEST(LyingHost, ThatSendsOneByteAndNoMoreRunsIntoTheTimeOut) {
    const std::string head = "HTTP/1.1 200 OK\r\nContent-Length: 12\r\n\r\n";
    for (const std::string& before : {std::string(), head}) {
        const LyingHost host([&before](const Victim& victim) {
            victim.hear();
            victim.send(before);
            victim.drip(before.empty() ? 'H' : '{');
        });
        for (const Words& verb : {Words{"agents"},
                                  {"start", "ux"},
                                  {"config", "get", "ux"},
                                  {"depot", "sum", "a", "b"},
                                  {"doctor"},
                                  {"ps"},
                                  {"top"},
                                  {"events", "--count", "1"}}) {
            SCOPED_TRACE(before + verb.front());
            const ProgramResult result = ask(host, verb, "0.5");
            expectHarmless(result);
            EXPECT_EQ(result.status, 4) << result.err;
        }
    }
}

// ---- Documents that say something else ----------------------------------------------------------

struct Document {
    const char* name;
    Words verb;
    std::string body;
    int status;
    const char* said;  ///< on either output
};

const Document kDocuments[] = {
    {"a number for rows", {"agents"}, R"({"rows": 7})", 3, "has no rows"},
    {"a list for the document", {"agents"}, "[[]]", 3, "has no rows"},
    {"rows twice", {"agents"}, R"({"rows": [], "rows": 7})", 3, "has no rows"},
    {"rows of numbers", {"agents"}, R"({"rows": [1, null, "x"]})", 3, "has rows that are none"},
    {"a reply without columns",
     {"query", "KAGREQT", "COMMAND=STOP", "--yes"},
     R"({"rows": [{}]})",
     1,
     "the host gave no return code"},
    {"a return code out of range",
     {"query", "KAGREQT", "COMMAND=STOP", "--yes"},
     R"({"rows": [{"RETVAL": 4294967296}]})",
     1,
     "the host gave no return code"},
    {"a return code that is text",
     {"query", "KAGREQT", "COMMAND=STOP", "--yes"},
     R"({"rows": [{"RETVAL": "0"}]})",
     1,
     "the host gave no return code"},
    {"no configuration at all",
     {"config", "get", "ux"},
     R"({"rows": [{}], "full": [7, {"row": 0}]})",
     1,
     "the host gave no return code"},
    {"no rows for a configuration",
     {"config", "get", "ux"},
     R"({"rows": []})",
     1,
     "it is not known what became of it"},
    {"a number for the health", {"status"}, "7", 3, "does not say how it is"},
    {"a list for the health at a glance", {"top"}, "[]", 3, "does not say how it is"},
    {"text for the depot",
     {"depot", "ls", "-l"},
     R"("x")",
     3,
     "not a list of what the depot holds"},
    {"entries that are none",
     {"depot", "ls", "-l"},
     R"({"entries": 7})",
     3,
     "not a list of what the depot holds"},
    {"fewer sums than files",
     {"depot", "sum", "a", "b"},
     R"({"files": [{"sha256": "x"}]})",
     3,
     "makes no sense"},
    {"sums that are none", {"depot", "sum", "a"}, R"({"files": [[]]})", 1, "has no sum"},
    {"checks that are none", {"doctor"}, R"([{"check": 7}])", 3, "not a list of checks"},
    {"warnings that are none",
     {"agents"},
     R"({"rows": [], "warnings": [7, {"stdout": {}}]})",
     1,
     "could not be found out in full"},
};

TEST(LyingHost, WhoseDocumentSaysSomethingElseIsAFailureThatSaysWhy) {
    for (const Document& lie : kDocuments) {
        SCOPED_TRACE(lie.name);
        const LyingHost host(answering(lie.body));
        const ProgramResult result = ask(host, lie.verb);
        expectHarmless(result);
        EXPECT_EQ(result.status, lie.status);
        EXPECT_THAT(result.err, HasSubstr(lie.said));
    }
}

/// Says all that `top` asks for but whether it is ready: that is a lie of its own.
LyingHost::Lie lyingAboutReadiness(const LyingHost::Lie& lie) {
    return [lie](const Victim& victim) {
        const std::string request = victim.hear();
        const auto asks = [&request](const char* path) {
            return request.rfind(std::string("GET ") + path, 0) == 0;
        };
        if (asks("/v1/ready")) return lie(victim);
        victim.send(ok(asks("/v1/tasks")       ? R"({"tasks": [], "next": null})"
                       : asks("/v1/instances") ? R"({"instances": []})"
                                               : R"({"version": "1.0"})"));
    };
}

TEST(LyingHost, WhoseReadinessIsNoObjectIsShownWithoutIt) {
    const std::string bodies[] = {"",     "{\"ready\": tr", "7",  "[]",
                                  "null", "true",           "\"", std::string(1000, '[')};
    for (const std::string& body : bodies) {
        SCOPED_TRACE(body);
        const LyingHost host(
            lyingAboutReadiness([&body](const Victim& victim) { victim.send(ok(body)); }));
        const ProgramResult result = ask(host, {"--json", "top"});
        expectHarmless(result);
        EXPECT_EQ(result.status, 0) << result.err;
        EXPECT_THAT(result.out, HasSubstr("\"ready\": null"));
        EXPECT_THAT(result.out, HasSubstr("\"version\": \"1.0\""));
    }
}

TEST(LyingHost, WhoseReadinessHasNoEndIsAFailureThatSaysWhy) {
    const LyingHost host(lyingAboutReadiness([](const Victim& victim) {
        victim.send("HTTP/1.1 503 Service Unavailable\r\nConnection: close\r\n\r\n");
        victim.sendWithoutEnd(std::string(65536, ' '));
    }));
    const ProgramResult result = ask(host, {"top"});
    expectHarmless(result);
    EXPECT_EQ(result.status, 3);
    EXPECT_THAT(result.err, HasSubstr("is larger than 64 MiB"));
}

TEST(LyingHost, IsShownWithItsEscapeSequencesAsText) {
    const std::string evil = R"(\u001b[2J\u009b1m\u0007\r\n\u0000)";
    const std::pair<Words, std::string> documents[] = {
        {{"agents"}, R"({"rows": [{"PRODUCT": ")" + evil + R"("}]})"},
        {{"query", "KINAGT"}, R"({"rows": [{")" + evil + R"(": ")" + evil + R"("}]})"},
        {{"depot", "ls"}, R"({"entries": [{"name": ")" + evil + R"("}]})"},
        {{"depot", "ls", "-l"},
         R"({"entries": [{"name": ")" + evil + R"(", "modified": ")" + evil + R"("}]})"},
        {{"depot", "sum", "a"}, R"({"files": [{"sha256": ")" + evil + R"(", "path": "a"}]})"},
        {{"status"}, R"({"version": ")" + evil + R"("})"},
        {{"version"}, R"({"version": ")" + evil + R"("})"},
        {{"doctor"},
         R"([{"check": ")" + evil + R"(", "result": ")" + evil + R"(", "text": ")" + evil +
             R"(", "remedy": ")" + evil + R"("}])"},
    };
    for (const auto& [verb, body] : documents) {
        const LyingHost host(answering(body));
        for (const bool isJson : {false, true}) {
            SCOPED_TRACE(verb.front());
            Words line = verb;
            if (isJson) line.insert(line.begin(), "--json");
            const ProgramResult result = ask(host, line);
            expectHarmless(result);
            EXPECT_EQ(result.status, 0) << result.err;
            EXPECT_THAT(result.out, HasSubstr(isJson ? "\\u001b[2J" : "\\x1B[2J"));
        }
    }
}

TEST(LyingHost, WhoseNumbersCannotBeIsNotRepeated) {
    const LyingHost host(
        answering(R"({"id": "7", "command": "START", "state": "failed", "details": {"commands": [)"
                  R"({"command": "a", "pid": -1, "exit": 4294967296, "ended": "x"}]}})"));
    const ProgramResult result = ask(host, {"task", "show", "7"});
    expectHarmless(result);
    EXPECT_THAT(result.out, HasSubstr("exit code 4294967296, which makes no sense"));
}

// ---- Streams ------------------------------------------------------------------------------------

std::string stream(const std::string& lines) {
    return "HTTP/1.1 200 OK\r\nContent-Type: text/event-stream\r\n\r\n" + lines;
}

TEST(LyingHost, WhoseEventsAreNoneRunsIntoTheTimeOutOrIsNoHost) {
    const auto withoutEnd = [](const std::string& lines) {
        return [lines](const Victim& victim) {
            victim.hear();
            victim.send(stream(""));
            victim.sendWithoutEnd(lines);
        };
    };
    const std::pair<LyingHost::Lie, int> lies[] = {
        {withoutEnd(std::string(65536, 'x')), 3},                   // a line without end
        {withoutEnd("data: " + std::string(1000, 'x') + "\n"), 3},  // an event without end
        {withoutEnd(":\n\n"), 4},                                   // nothing but comments
        {withoutEnd("data: [1]\n\n"), 4},                           // events that are no rows
        {withoutEnd("data: {\n\n"), 4},
        {withoutEnd("data: " + std::string(1000, '[') + "\n\n"), 4},
        {saying(stream("data: {}")), 3},  // ends before its event does
        {saying(ok("{}")), 3},
    };
    for (const auto& [lie, status] : lies) {
        const LyingHost host(lie);
        const ProgramResult result =
            ask(host, {"events", "--count", "1"}, status == 4 ? "3" : kTimeEnough);
        expectHarmless(result);
        EXPECT_EQ(result.status, status) << result.err;
        EXPECT_NE(result.err, "");
    }
}

TEST(LyingHost, WhoseEventsHoldEscapeSequencesIsShownAsText) {
    const LyingHost host(
        saying(stream("event: \x1b[2J\ndata: \x07\n\n"
                      "data: {\"TRANSID\": \"\\u001b[2J\"}\n\n")));
    const ProgramResult result = ask(host, {"events", "--count", "1"});
    expectHarmless(result);
    EXPECT_THAT(result.out, HasSubstr("\\x1B[2J"));
}

// ---- File transfers -----------------------------------------------------------------------------

std::string rpcPacket(char type, const std::string& body) {
    std::string bytes("\5\0\0\3\x10\0\0\0\0\0\0\0\1\0\0\0", 16);
    bytes[2] = type;
    bytes[8] = static_cast<char>((16 + body.size()) & 0xFFU);
    bytes[9] = static_cast<char>((16 + body.size()) >> 8);
    return bytes + body;
}

std::string rpcBindAck() {
    return rpcPacket(12, std::string("\0\x10\0\x10\1\0\0\0\0\0\0\0\1\0\0\0\0\0\0\0", 20) +
                             std::string(20, '\0'));
}

TEST(LyingHost, ThatTakesFilesInWordsOnlyIsAFailure) {
    const ScratchDir files;
    const std::string file = files.write("file", "content");
    const LyingHost older(saying("HTTP/1.1 404 Not Found\r\nContent-Length: 2\r\n\r\n{}"));
    const auto after = [](const std::string& bytes) {
        return [bytes](const Victim& victim) {
            victim.hear();
            victim.send(rpcBindAck());
            victim.hear();
            victim.send(bytes);
        };
    };
    const std::pair<LyingHost::Lie, int> lies[] = {
        {saying(""), 3},
        {saying("HTTP/1.1 200 OK\r\n\r\n"), 3},
        {saying(rpcPacket(12, "")), 3},  // an acknowledgement of nothing
        {saying(rpcPacket(13, "")), 3},
        {saying(std::string("\5\0\x0c\3\x10\0\0\0\0\0\0\0\1\0\0\0", 16)),
         3},  // shorter than itself
        {[](const Victim& victim) { victim.sendWithoutEnd(std::string(65536, '\5')); }, 3},
        {[](const Victim& victim) { victim.drip('\5'); }, 4},
        {[](const Victim& victim) {
             victim.hear();
             victim.send(rpcBindAck());
             victim.drip('\5');
         },
         4},
        {after(""), 3},
        {after(rpcPacket(2, "")), 3},
        {after(rpcPacket(2, std::string(8, '\0') + "\xff\xff\xff\x7f")), 1},
        {after(rpcPacket(3, std::string(8, '\0') + "\x1b\x1b\x1b\x1b")), 1},
        {after(rpcPacket(99, std::string(12, '\0'))), 3},
    };
    int number = 0;
    for (const auto& [lie, status] : lies) {
        SCOPED_TRACE(number++);
        const LyingHost transfers(lie);
        const ProgramResult result =
            runProgram({zavctlPath(), "--socket", older.path(), "--rpc-socket", transfers.path(),
                        "--timeout", status == 4 ? "1" : kTimeEnough, "push", file});
        expectHarmless(result);
        EXPECT_EQ(result.status, status) << result.out << result.err;
        EXPECT_NE(result.out + result.err, "");
    }
}

TEST(LyingHost, WhoseWordsAboutThePushAreSenselessIsNotBelieved) {
    const ScratchDir files;
    const std::string file = files.write("file", "content");
    for (const char* body :
         {"7", "{}", R"({"files": 7})", R"({"files": []})", R"({"files": [7, 7]})"}) {
        const LyingHost host(answering(body));
        const ProgramResult result = runProgram({zavctlPath(), "--socket", host.path(),
                                                 "--rpc-socket", files.path("none"), "push", file});
        expectHarmless(result);
        EXPECT_EQ(result.status, 3) << body;
    }
    const LyingHost full(answering(
        R"({"guarded": true, "free_bytes": -1, "files": [{"taken": "no", "converted": 7}]})"));
    const ProgramResult result = runProgram(
        {zavctlPath(), "--socket", full.path(), "--rpc-socket", files.path("none"), "push", file});
    expectHarmless(result);
    EXPECT_EQ(result.status, 1) << "no room is known of";
}

}  // namespace
