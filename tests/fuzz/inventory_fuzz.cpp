// The inventory program's and the architecture probe's reports.

#include <algorithm>
#include <tuple>

#include "support/fuzz_support.h"
#include "tables/inventory.h"

using fuzz::require;

namespace {

using Fields =
    std::tuple<std::u16string, std::u16string, std::u16string, std::u16string, std::u16string>;

void checkField(const std::u16string& field) {
    require(!field.empty(), "no field is empty");
    require(field.find_first_of(u"\n\r,\"") == std::u16string::npos, "fields hold no delimiter");
}

Fields fieldsOf(const InstalledProduct& product) {
    Fields fields{fuzz::unitsOf(product.code), fuzz::unitsOf(product.description),
                  fuzz::unitsOf(product.platform), fuzz::unitsOf(product.version),
                  fuzz::unitsOf(product.release)};
    std::apply([](const auto&... field) { (checkField(field), ...); }, fields);
    require(std::get<3>(fields).size() != 8, "versions of eight characters are widened");
    return fields;
}

void checkProducts(const ZAV::String& report) {
    int found = 0;
    const auto collect = [&](const InstalledProduct& product) {
        fieldsOf(product);
        ++found;
        return 0;
    };
    require(forEachProduct(report, collect) == 0, "a walk to the end is a success");
    const std::u16string units = fuzz::unitsOf(report);
    require(found <= std::count(units.begin(), units.end(), u'\n'), "a line is at most a product");
    if (found == 0) return;
    int left = (found + 1) / 2;
    const auto stop = [&left](const InstalledProduct&) { return --left == 0 ? 7 : 0; };
    require(forEachProduct(report, stop) == 7 && left == 0, "a walk ends where it is told to");
}

void checkProbe(const ZAV::String& output) {
    const HostArchitecture host = parseArchitectureProbe(output);
    const std::u16string os = fuzz::unitsOf(host.os);
    const std::u16string architecture = fuzz::unitsOf(host.architecture);
    require(os.empty() == architecture.empty(), "both are known or neither");
    require((os + architecture).find(u'\n') == std::u16string::npos, "values are single lines");
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const ZAV::String report = fuzz::stringOf(fuzz::Input(data, size).rest());
    checkProducts(report);
    checkProbe(report);
    return 0;
}
