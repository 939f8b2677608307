#include "soak/load/http_text.h"

#include <algorithm>
#include <cstdlib>
#include <nlohmann/json.hpp>
#include <stdexcept>

namespace soak {
namespace {

using nlohmann::json;

/// Without its end of line; the value of a header field, or nothing.
std::optional<std::string> field(const std::string& head, const std::string& name) {
    const std::size_t at = head.find("\r\n" + name + ": ");
    if (at == std::string::npos) return std::nullopt;
    const std::size_t begin = at + name.size() + 4;
    return head.substr(begin, head.find("\r\n", begin) - begin);
}

OutcomeRow outcomeOf(const json& document) {
    OutcomeRow row;
    row.originNode = document.at("ORIGINNODE").get<std::string>();
    row.transid = document.at("TRANSID").get<std::string>();
    row.command = document.at("COMMAND").get<std::string>();
    row.retval = document.at("RETVAL").get<int>();
    row.messageId = document.at("RETMSGID").get<std::string>();
    row.target = document.at("TARGETMSN").get<std::string>();
    return row;
}

/// Takes the first line, if it begins so, out of `text`; what follows.
std::string takeLine(std::string& text, const std::string& name) {
    if (text.rfind(name, 0) != 0) return {};
    const std::size_t end = std::min(text.size(), text.find('\n'));
    const std::string value = text.substr(name.size(), end - name.size());
    text.erase(0, end + 1);
    return value;
}

}  // namespace

std::string getRequest(const std::string& target) {
    return "GET " + target + " HTTP/1.1\r\nHost: soak\r\n\r\n";
}

std::string postRequest(const std::string& target, const std::string& body) {
    return "POST " + target +
           " HTTP/1.1\r\nHost: soak\r\nContent-Length: " + std::to_string(body.size()) +
           "\r\n\r\n" + body;
}

std::string queryBody(const std::string& table,
                      const std::vector<std::pair<std::string, std::string>>& where) {
    json document = {{"table", table}, {"where", json::array()}};
    for (const auto& [column, value] : where) {
        document["where"].push_back({{"column", column}, {"op", "="}, {"value", value}});
    }
    return document.dump();
}

std::optional<Answer> takeAnswer(std::string& in) {
    const std::size_t end = in.find("\r\n\r\n");
    if (end == std::string::npos) return std::nullopt;
    const std::string head = in.substr(0, end + 2);
    Answer answer;
    answer.status = head.rfind("HTTP/1.1 ", 0) == 0 ? std::atoi(head.c_str() + 9) : -1;
    if (answer.status == 100) {
        in.erase(0, end + 4);
        return takeAnswer(in);
    }
    const auto length = field(head, "Content-Length");
    answer.closes = field(head, "Connection").value_or("") == "close";
    if (!length) {
        in.erase(0, end + 4);
        return answer;
    }
    const std::size_t bytes = std::strtoul(length->c_str(), nullptr, 10);
    if (in.size() < end + 4 + bytes) return std::nullopt;
    answer.body = in.substr(end + 4, bytes);
    in.erase(0, end + 4 + bytes);
    return answer;
}

std::optional<EventMessage> takeEvent(std::string& in) {
    std::string text;
    do {  // a message that begins with a colon is a comment, which an idle stream sends
        const std::size_t end = in.find("\n\n");
        if (end == std::string::npos) return std::nullopt;
        text = in.substr(0, end);
        in.erase(0, end + 2);
    } while (text.rfind(':', 0) == 0);
    const std::string gap = "event: gap\ndata: ";
    const std::string data = "data: ";
    const std::string task = "event: task\ndata: ";
    EventMessage message;
    message.id = takeLine(text, "id: ");
    try {
        if (text.rfind(gap, 0) == 0) {
            message.gap = true;
            message.lost = json::parse(text.substr(gap.size())).at("missing").get<std::size_t>();
        } else if (text.rfind(task, 0) == 0) {
            const json document = json::parse(text.substr(task.size()));
            message.end = TaskEnd{document.at("transid").get<std::string>(),
                                  document.at("state").get<std::string>()};
        } else if (text.rfind(data, 0) == 0) {
            message.row = outcomeOf(json::parse(text.substr(data.size())));
        } else {
            throw std::runtime_error("malformed event: " + text);
        }
    } catch (const json::exception& error) {
        throw std::runtime_error(std::string(error.what()) + " in the event: " + text);
    }
    return message;
}

}  // namespace soak
