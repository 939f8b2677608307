// Names of transferred files: none that is let through leads out of the depot.

#include <filesystem>

#include "rpc/transfer_path.h"
#include "support/fuzz_support.h"

using fuzz::require;
using ZAV::String;

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    const std::string bytes = fuzz::upToZero(fuzz::Input(data, size).rest());
    const String name = ZAV::transferName(bytes.c_str());
    require(fuzz::unitsOf(name).find(u'\\') == std::u16string::npos, "no other separator is left");
    // A directory that is not there: only the name itself decides.
    const String depot("/nonexistent/depot/");
    if (ZAV::leadsOutOfDepot(depot, name)) return 0;
    const ZAV::CharStar narrow = (depot + name).c_str();
    const std::filesystem::path path(static_cast<const char*>(narrow));
    const std::string resolved = path.lexically_normal().string() + "/";
    require(resolved.rfind("/nonexistent/depot/", 0) == 0, "the name stays in the depot");
    return 0;
}
