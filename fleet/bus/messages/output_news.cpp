#include "fleet/bus/messages/output_news.h"

#include <algorithm>
#include <nlohmann/json.hpp>

#include "fleet/bus/messages/document.h"

using nlohmann::json;

namespace fleet {
namespace {

constexpr const char* kErrors = "stderr";
constexpr const char* kOutput = "stdout";
/// A link's pieces have fewer.
constexpr std::size_t kMostTexts = std::size_t{16} * 1024;

std::vector<OutputText> outputTextsIn(const json& document) {
    const auto list = document.find("output");
    if (list == document.end() || !list->is_array() || list->size() > kMostTexts) {
        throw MessageError("there is no list of output");
    }
    std::vector<OutputText> texts;
    for (const json& one : *list) {
        if (!one.is_object()) throw MessageError("a part of the output is no object");
        const std::string stream = textIn(one, "stream");
        if (stream != kErrors && stream != kOutput) throw MessageError("there is no such output");
        texts.push_back({stream == kErrors, textIn(one, "text")});
    }
    return texts;
}

bool isInsideCharacter(char byte) {
    return (static_cast<unsigned char>(byte) & 0xC0U) == 0x80U;
}

}  // namespace

std::string textOfNews(const OutputNews& news) {
    json output = json::array();
    for (const OutputText& one : news.texts)
        output.push_back({{"stream", one.isError ? kErrors : kOutput}, {"text", one.text}});
    return textOf({{"stream", news.stream},
                   {"after", news.after},
                   {"at", news.at},
                   {"output", std::move(output)},
                   {"lost", news.lost},
                   {"over", news.isOver},
                   {"error", news.error},
                   {"status", news.status}});
}

OutputNews readNews(std::string_view text) {
    const json document = readDocument(text);
    OutputNews news;
    news.stream = textIn(document, "stream");
    news.after = textIn(document, "after");
    news.at = textIn(document, "at");
    news.texts = outputTextsIn(document);
    news.lost = numberIn(document, "lost");
    news.isOver = flagIn(document, "over");
    news.error = textIn(document, "error");
    news.status = numberIn(document, "status");
    return news;
}

std::vector<std::string> outputParts(std::string_view text) {
    std::vector<std::string> parts;
    while (!text.empty()) {
        std::size_t length = std::min(text.size(), kMostOutputText);
        if (length < text.size()) {
            std::size_t begin = length;
            while (begin > 0 && isInsideCharacter(text[begin]))
                --begin;
            // What is no UTF-8 is cut anywhere.
            if (begin > 0) length = begin;
        }
        parts.emplace_back(text.substr(0, length));
        text.remove_prefix(length);
    }
    return parts;
}

}  // namespace fleet
