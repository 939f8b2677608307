#include "http/url.h"

namespace http {
namespace {

int hexDigit(char c) {
    if (c >= '0' && c <= '9') return c - '0';
    if (c >= 'a' && c <= 'f') return c - 'a' + 10;
    if (c >= 'A' && c <= 'F') return c - 'A' + 10;
    return -1;
}

std::optional<std::string> decode(std::string_view text, bool plusIsBlank) {
    std::string out;
    out.reserve(text.size());
    for (std::size_t i = 0; i < text.size(); ++i) {
        if (text[i] != '%') {
            out += plusIsBlank && text[i] == '+' ? ' ' : text[i];
            continue;
        }
        if (text.size() - i < 3) return std::nullopt;
        const int high = hexDigit(text[i + 1]);
        const int low = hexDigit(text[i + 2]);
        if (high < 0 || low < 0 || (high == 0 && low == 0)) return std::nullopt;
        out += static_cast<char>(high * 16 + low);
        i += 2;
    }
    return out;
}

/// The segments of a path whose escapes are well-formed. A path without a leading slash, such as
/// "*", is one segment that no route has.
std::vector<std::string> segmentsOf(std::string_view path) {
    std::vector<std::string> segments;
    if (path.empty() || path.front() != '/') return {std::string(path)};
    while (!path.empty()) {
        path.remove_prefix(1);
        const std::string_view segment = path.substr(0, path.find('/'));
        segments.push_back(decode(segment, false).value_or(""));
        path.remove_prefix(segment.size());
    }
    return segments;
}

/// What follows scheme and host of an absolute target.
std::string_view withoutOrigin(std::string_view target) {
    constexpr std::string_view scheme = "http://";
    if (target.substr(0, scheme.size()) != scheme) return target;
    target.remove_prefix(scheme.size());
    const std::size_t end = target.find_first_of("/?");
    return end == std::string_view::npos ? "/" : target.substr(end);
}

}  // namespace

std::optional<Target> parseTarget(std::string_view target) {
    target = withoutOrigin(target);
    target = target.substr(0, target.find('#'));
    const std::size_t mark = target.find('?');
    const std::string_view encoded = target.substr(0, mark);
    const std::optional<std::string> path = decode(encoded, false);
    if (!path) return std::nullopt;
    Target parsed{*path, segmentsOf(encoded), {}};
    std::string_view rest =
        mark == std::string_view::npos ? std::string_view() : target.substr(mark + 1);
    while (!rest.empty()) {
        const std::string_view item = rest.substr(0, rest.find('&'));
        rest.remove_prefix(item.size() == rest.size() ? item.size() : item.size() + 1);
        if (item.empty()) continue;
        const std::size_t equals = item.find('=');
        const auto name = decode(item.substr(0, equals), true);
        const auto value = equals == std::string_view::npos ? std::optional<std::string>("")
                                                            : decode(item.substr(equals + 1), true);
        if (!name || !value) return std::nullopt;
        parsed.parameters.emplace_back(*name, *value);
    }
    return parsed;
}

}  // namespace http
