#include <cstdlib>
#include <memory>
#include <optional>
#include <stdexcept>

#include "request/clients.h"
#include "request/connection.h"

namespace request {

namespace {

/// The length of an answer whose head has come, with its head.
std::optional<std::size_t> answerLength(const std::string& bytes) {
    const std::size_t end = bytes.find("\r\n\r\n");
    if (end == std::string::npos) return std::nullopt;
    const std::string field = "\r\nContent-Length: ";
    const std::size_t at = bytes.find(field);
    if (at == std::string::npos || at > end) throw std::runtime_error("an answer without length");
    return end + 4 + std::strtoul(bytes.c_str() + at + field.size(), nullptr, 10);
}

std::string receiveAnswer(Connection& connection) {
    std::string bytes;
    for (;;) {
        const std::optional<std::size_t> length = answerLength(bytes);
        if (length && bytes.size() >= *length) return bytes;
        if (!connection.receive(bytes)) throw std::runtime_error("the answer is cut");
    }
}

}  // namespace

Exchange hostQuery(const std::string& path, const std::string& query, bool keep) {
    const std::string request =
        "POST /v1/query HTTP/1.1\r\nHost: localhost\r\nContent-Type: application/json\r\n"
        "Content-Length: " +
        std::to_string(query.size()) + "\r\n\r\n" + query;
    const auto kept = std::make_shared<std::unique_ptr<Connection>>();
    return [path, request, keep, kept] {
        if (!keep || !*kept) *kept = std::make_unique<Connection>(path);
        (*kept)->send(request);
        std::string answer = receiveAnswer(**kept);
        if (!keep) kept->reset();
        return answer;
    };
}

}  // namespace request
