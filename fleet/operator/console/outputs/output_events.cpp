#include "fleet/operator/console/outputs/output_events.h"

#include <nlohmann/json.hpp>
#include <string_view>
#include <utility>

#include "fleet/bus/messages/document.h"
#include "http/event_source.h"

using nlohmann::json;

namespace fleet {
namespace {

std::string eventOf(std::string_view name, const json& data, std::string_view id = {}) {
    std::string text;
    http::appendEvent(text, {textOf(data), name, id});
    return text;
}

}  // namespace

void OutputEvents::add(const OutputText& text) {
    write("");
    last_ = text;
}

void OutputEvents::addLost(Number bytes) {
    write("");
    text_ += eventOf("overflow", {{"lost", bytes}});
}

void OutputEvents::addGap() {
    write("");
    text_ += eventOf("gap", json::object());
}

std::string OutputEvents::upTo(const std::string& position) {
    write(position);
    return std::exchange(text_, {});
}

void OutputEvents::write(const std::string& position) {
    if (!last_) return;
    text_ += eventOf({}, {{"stream", last_->isError ? "stderr" : "stdout"}, {"text", last_->text}},
                     position);
    last_.reset();
}

std::string outputEnd() {
    return eventOf("end", json::object());
}

std::string outputBreak(const ctl::Failure& failure) {
    json data = {{"error", failure.what()}};
    if (!failure.hint().empty()) data["hint"] = failure.hint();
    return eventOf("break", data);
}

}  // namespace fleet
