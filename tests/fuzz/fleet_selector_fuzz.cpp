// Selectors: whatever text comes is refused with a SelectorError or decides about every host,
// always the same way, whatever the host is called. An input is a line with the selector, one with
// a host's name, and lines NAME=VALUE for its labels.

#include "fleet/bus/messages/selector.h"

#include <optional>

#include "support/fuzz_support.h"

using fuzz::require;

namespace {

std::optional<fleet::Selector> selectorOf(std::string_view text) {
    try {
        return fleet::Selector(text);
    } catch (const fleet::SelectorError& refused) {
        require(*refused.what() != '\0', "a refusal says why");
        return std::nullopt;
    }
}

fleet::Labels labelsIn(fuzz::Input& input) {
    fleet::Labels labels;
    while (!input.isEmpty()) {
        const std::string_view line = input.line();
        const std::size_t equals = std::min(line.find('='), line.size());
        labels[std::string(line.substr(0, equals))] =
            line.substr(std::min(equals + 1, line.size()));
    }
    return labels;
}

/// A term that is negated decides the other way.
void checkNegation(std::string_view term, const std::string& host, const fleet::Labels& labels) {
    if (term.empty() || term.find_first_of("!=*,() ") != std::string_view::npos) return;
    const auto there = selectorOf(term);
    const auto missing = selectorOf("!" + std::string(term));
    if (!there || !missing) return;
    require(there->matches(host, labels) != missing->matches(host, labels),
            "a label is there or missing");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    const std::string_view text = input.line();
    const std::string host(input.line());
    const fleet::Labels labels = labelsIn(input);
    require(selectorOf("*")->matches(host, labels), "every host is one of all");
    checkNegation(text, host, labels);
    const auto selector = selectorOf(text);
    if (!selector) return 0;
    const bool isMeant = selector->matches(host, labels);
    const auto withAll = selectorOf(std::string(text) + ",*");
    require(!withAll || withAll->matches(host, labels) == isMeant,
            "a term that always holds changes nothing");
    return 0;
}
