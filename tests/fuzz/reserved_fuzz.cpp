// The RESERVED column: what is understood can be put together again and means the same.

#include <array>

#include "support/fuzz_support.h"
#include "util/zavutil.h"

using fuzz::require;
using ZAV::String;

namespace {

/// Agent level and architecture, shared component's version and architecture, common version.
using Values = std::array<String, 5>;

bool parse(const String& reserved, Values& values) {
    return ZAV::Util::parseReserved(reserved, values[0], values[1], values[2], values[3],
                                    values[4]);
}

String joined(const Values& values) {
    return String("A=") + values[0] + ":" + values[1] + ";C=" + values[2] + ":" + values[3] +
           ";G=" + values[4] + ":" + values[1];
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const String reserved = fuzz::stringOf(fuzz::Input(data, size).rest());
    Values values;
    const bool understood = parse(reserved, values);
    bool complete = understood;
    for (const String& value : values) {
        const std::u16string units = fuzz::unitsOf(value);
        require(units.find_first_of(u"=:;") == std::u16string::npos, "values hold no delimiter");
        complete = complete && !units.empty();
    }
    for (const std::size_t version : {std::size_t{2}, std::size_t{4}}) {
        require(fuzz::unitsOf(values[version]).find(u'.') == std::u16string::npos,
                "versions hold no dots");
    }
    if (!complete) return 0;
    Values again;
    require(parse(joined(values), again), "what was understood is understood again");
    require(values == again, "and means the same");
    return 0;
}
