// ctest-label: threaded
// Ways to frame a request that two readers may understand differently. Whoever stands between a
// client and the host must never see another number of requests than the host does.
#include <gmock/gmock.h>
#include <gtest/gtest.h>

#include "host/server_fixture.h"

namespace {

using testing::HasSubstr;

class Framing : public ServerTest {};

struct Case {
    const char* what;
    std::string bytes;
    int status;
};

/// A second request that nobody may see as one of its own.
const std::string kHidden = "GET /v1/hidden HTTP/1.1\r\nHost: x\r\n\r\n";

std::string post(const std::string& fields, const std::string& rest) {
    return "POST /v1/query HTTP/1.1\r\nHost: x\r\n" + fields + "\r\n" + rest;
}

const Case kRefused[] = {
    {"both lengths, the plain one first",
     post("Content-Length: 4\r\nTransfer-Encoding: chunked\r\n", "0\r\n\r\n" + kHidden), 400},
    {"both lengths, chunked first",
     post("Transfer-Encoding: chunked\r\nContent-Length: 4\r\n", "0\r\n\r\n" + kHidden), 400},
    {"two different lengths", post("Content-Length: 0\r\nContent-Length: 40\r\n", kHidden), 400},
    {"the same length twice", post("Content-Length: 0\r\nContent-Length: 0\r\n", kHidden), 400},
    {"a list of equal lengths", post("Content-Length: 0, 0\r\n", kHidden), 400},
    {"a list of different lengths", post("Content-Length: 0, 40\r\n", kHidden), 400},
    {"a length with a sign", post("Content-Length: +40\r\n", kHidden), 400},
    {"a negative length", post("Content-Length: -1\r\n", kHidden), 400},
    {"a hexadecimal length", post("Content-Length: 0x28\r\n", kHidden), 400},
    {"a length beyond 64 bits", post("Content-Length: 18446744073709551656\r\n", kHidden), 400},
    {"an empty length", post("Content-Length: \r\n", kHidden), 400},
    {"another coding", post("Transfer-Encoding: gzip\r\n", kHidden), 501},
    {"another coding before chunked", post("Transfer-Encoding: gzip, chunked\r\n", kHidden), 501},
    {"chunked that is not the last coding",
     post("Transfer-Encoding: chunked, identity\r\n", kHidden), 501},
    {"chunked twice", post("Transfer-Encoding: chunked, chunked\r\n", kHidden), 501},
    {"chunked in two fields",
     post("Transfer-Encoding: chunked\r\nTransfer-Encoding: identity\r\n", kHidden), 400},
    {"a coding that only looks like chunked", post("Transfer-Encoding: xchunked\r\n", kHidden),
     501},
    {"a quoted coding", post("Transfer-Encoding: \"chunked\"\r\n", kHidden), 501},
    {"an empty coding", post("Transfer-Encoding: \r\n", kHidden), 501},
    {"a field that goes on in the next line",
     post("Transfer-Encoding:\r\n chunked\r\n", "0\r\n\r\n" + kHidden), 400},
    {"a field that goes on behind a tab", post("X: a\r\n\tContent-Length: 40\r\n", kHidden), 400},
    {"a blank before the colon", post("Content-Length : 40\r\n", kHidden), 400},
    {"a blank before the first field",
     "POST /v1/query HTTP/1.1\r\n Content-Length: 40\r\n\r\n" + kHidden, 400},
    {"a field without a name", post(": 40\r\n", kHidden), 400},
    {"a line feed alone", post("X: a\nContent-Length: 40\r\n", kHidden), 400},
    {"a carriage return alone", post("X: a\rContent-Length: 40\r\n", kHidden), 400},
    {"a character 0 in a field", post(std::string("X: a\0b\r\n", 8), kHidden), 400},
    {"a chunk's size with a sign", post("Transfer-Encoding: chunked\r\n", "+0\r\n\r\n" + kHidden),
     400},
    {"a chunk's size as in a program",
     post("Transfer-Encoding: chunked\r\n", "0x0\r\n\r\n" + kHidden), 400},
    {"a chunk's size beyond 64 bits",
     post("Transfer-Encoding: chunked\r\n", "10000000000000000\r\n\r\n" + kHidden), 400},
    {"a chunk without its end",
     post("Transfer-Encoding: chunked\r\n", "2\r\n{}x\r\n0\r\n\r\n" + kHidden), 400},
    {"a line feed alone in a chunk's extension",
     post("Transfer-Encoding: chunked\r\n", "2;a\nb\r\n{}\r\n0\r\n\r\n" + kHidden), 400},
    {"a line feed alone in the quoted extension of a chunk",
     post("Transfer-Encoding: chunked\r\n", "2;a=\"\n\"\r\n{}\r\n0\r\n\r\n" + kHidden), 400},
    {"a line feed alone in the extension of the last chunk",
     post("Transfer-Encoding: chunked\r\n", "0;a\n\r\n\r\n" + kHidden), 400},
    {"a carriage return alone in a chunk's extension",
     post("Transfer-Encoding: chunked\r\n", "2;a\rb\r\n{}\r\n0\r\n\r\n" + kHidden), 400},
    {"a line feed alone behind a chunk's size",
     post("Transfer-Encoding: chunked\r\n", "2\n{}\r\n0\r\n\r\n" + kHidden), 400},
    {"a line feed alone behind a chunk",
     post("Transfer-Encoding: chunked\r\n", "2\r\n{}\n0\r\n\r\n" + kHidden), 400},
    {"a length in the trailer",
     post("Transfer-Encoding: chunked\r\n", "0\r\nContent-Length: 40\r\n\r\n" + kHidden), 400},
    {"chunked in a version that knows no chunks",
     "POST /v1/query HTTP/1.0\r\nHost: x\r\nTransfer-Encoding: chunked\r\n\r\n0\r\n\r\n" + kHidden,
     400},
    {"chunked and kept alive in a version that knows no chunks",
     "POST /v1/query HTTP/1.0\r\nHost: x\r\nConnection: keep-alive\r\n"
     "Transfer-Encoding: chunked\r\n\r\n0\r\n\r\n" +
         kHidden,
     400},
    {"two hosts", "GET /v1/health HTTP/1.1\r\nHost: x\r\nHost: y\r\n\r\n" + kHidden, 400},
    {"the same host twice", "GET /v1/health HTTP/1.1\r\nHost: x\r\nhost: x\r\n\r\n" + kHidden, 400},
    {"a version of its own", "GET /v1/health HTTP/1.10\r\nHost: x\r\n\r\n" + kHidden, 400},
    {"the greeting of a later version", "PRI * HTTP/2.0\r\n\r\nSM\r\n\r\n" + kHidden, 400},
};

TEST_F(Framing, ThatCouldHideARequestIsRefusedAndEndsTheConnection) {
    start();
    for (const Case& one : kRefused) {
        RawClient client = connect();
        client.send(one.bytes);
        const auto answer = client.readAnswer();
        EXPECT_EQ(answer.status, one.status) << one.what << ": " << answer.body;
        EXPECT_THAT(answer.body, HasSubstr("{\"error\":\"")) << one.what;
        EXPECT_TRUE(client.isClosed()) << one.what;
    }
}

TEST_F(Framing, ThatIsUnusualButClearIsUnderstood) {
    start();
    const std::string body = R"({"table":"PLAIN"})";
    const std::string chunks = "11\r\n" + body + "\r\n0\r\n\r\n";
    for (const std::string& request :
         {post("transfer-encoding: CHUNKED\r\n", chunks),
          post("Transfer-Encoding:chunked\t\r\n", chunks),
          post("Transfer-Encoding: chunked\r\n", "11;name=\"va;lue\"\r\n" + body + "\r\n0\r\n\r\n"),
          post("Transfer-Encoding: chunked\r\n", "0011\r\n" + body + "\r\n00\r\n\r\n"),
          post("Content-Length: 17\r\n", body), post("Content-Length:   0017\r\n", body)}) {
        RawClient client = connect();
        client.send(request);
        EXPECT_EQ(client.readAnswer().status, 200) << request;
        // The next request begins where the first one ends.
        EXPECT_EQ(client.get("/v1/health").status, 200) << request;
    }
}

TEST_F(Framing, OfAHeadDoesNotDependOnHowItsBytesCome) {
    start();
    for (const Case& one : kRefused) {
        RawClient client = connect();
        for (const char byte : one.bytes.substr(0, one.bytes.find("\r\n\r\n") + 4)) {
            if (!client.send(std::string(1, byte))) break;
        }
        client.send(one.bytes.substr(one.bytes.find("\r\n\r\n") + 4));
        EXPECT_EQ(client.readAnswer().status, one.status) << one.what;
    }
}

}  // namespace
