#include "conformance/rule.h"

#include <cstdio>
#include <iterator>

namespace conformance {
namespace {

[[noreturn]] void notOffered(const char* what) {
    throw Unfulfilled(std::string("the driver offers no ") + what);
}

void append(std::vector<Operation>& all, std::vector<Operation> more) {
    all.insert(all.end(), std::make_move_iterator(more.begin()),
               std::make_move_iterator(more.end()));
}

}  // namespace

Answer Driver::query(const std::string&, const Conditions&) {
    notOffered("queries");
}

std::unique_ptr<Subscription> Driver::subscribe(const std::string&, const Conditions&, Sink) {
    notOffered("subscriptions");
}

CallResult Driver::call(const uuid__t&, std::uint32_t, std::uint16_t, const std::string&) {
    notOffered("remote calls");
}

std::unique_ptr<TraceCapture> Driver::captureTrace(Selection) {
    notOffered("look at traces");
}

Driver& Bench::driver() {
    if (!driver_) driver_ = makeDriver();
    return *driver_;
}

std::string shown(const std::string& text) {
    constexpr std::size_t kLongest = 60;
    std::string out = "\"";
    for (const char c : text.substr(0, kLongest)) {
        if (c >= ' ' && c <= '~') {
            out += c;
        } else {
            char number[8];
            std::snprintf(number, sizeof number, "\\x%02X", static_cast<unsigned char>(c));
            out += number;
        }
    }
    return out + (text.size() > kLongest ? "...\"" : "\"");
}

std::string shown(const char* text) {
    return text != nullptr ? shown(std::string(text)) : "null";
}

std::string shown(std::nullptr_t) {
    return "null";
}

std::string shown(bool value) {
    return value ? "true" : "false";
}

void require(bool holds, const std::string& what) {
    if (!holds) throw Unfulfilled(what);
}

std::vector<Operation> allOperations() {
    std::vector<Operation> all;
    append(all, bss1Operations());
    append(all, fsi1Operations());
    append(all, nls2Operations());
    append(all, xml1Operations());
    append(all, ras1Operations());
    append(all, oxaComparisonOperations());
    append(all, oxaRequestOperations());
    append(all, oxaManagerOperations());
    append(all, ncsOperations());
    return all;
}

}  // namespace conformance
