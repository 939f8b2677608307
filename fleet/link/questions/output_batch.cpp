#include "fleet/link/questions/output_batch.h"

#include <algorithm>
#include <nlohmann/json.hpp>
#include <utility>

#include "ctl/client/http/bounded_json.h"
#include "ctl/client/row.h"

using nlohmann::json;

namespace fleet {
namespace {

Number lostBytes(const json& data) {
    const auto found = data.is_object() ? data.find("lost") : data.end();
    if (found == data.end() || !found->is_number_unsigned()) return 0;
    return std::min(found->get<Number>(), kHighestNumber);
}

}  // namespace

void OutputBatch::add(const ctl::ServerEvent& event) {
    if (event.type == "end") isOver_ = true;
    const json data = ctl::objectIn(event.data);
    if (event.type == "overflow") lost_ = std::min(lost_ + lostBytes(data), kHighestNumber);
    if (event.type != "message") return;
    const bool isError = ctl::textOf(data, "stream") == "stderr";
    for (std::string& part : outputParts(ctl::textOf(data, "text"))) {
        bytes_ += part.size();
        texts_.push_back({{isError, std::move(part)}, ""});
    }
    if (!texts_.empty()) texts_.back().at = event.id;
}

OutputNews OutputBatch::take() {
    OutputNews news;
    news.lost = std::exchange(lost_, 0);
    std::size_t taken = 0;
    while (!texts_.empty()) {
        Held& next = texts_.front();
        const std::size_t length = next.text.text.size();
        const bool isMuch = taken + length > kMostOutputText || news.texts.size() >= kMostTexts;
        if (isMuch && !news.texts.empty()) break;
        taken += length;
        if (!next.at.empty()) at_ = std::move(next.at);
        news.texts.push_back(std::move(next.text));
        texts_.pop_front();
    }
    bytes_ -= taken;
    news.at = at_;
    news.isOver = isOver_ && texts_.empty();
    if (news.isOver) isOver_ = false;
    return news;
}

}  // namespace fleet
