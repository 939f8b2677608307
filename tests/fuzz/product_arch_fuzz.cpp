// What the inventory program says about one product and about all of them. The program itself is
// replaced at link time: it prints the input, of which the first line is the product asked for and
// the second the preferred platform.

#include "support/fuzz_support.h"
#include "tasks/home.h"
#include "tasks/product_arch.h"
#include "util/zavutil.h"

using fuzz::require;
using ZAV::String;

namespace {

String& report() {
    static String& text = *new String;
    return text;
}

bool isToken(const std::u16string& text, const char16_t* delimiters) {
    return text.find_first_of(delimiters) == std::u16string::npos;
}

}  // namespace

/// Takes the place of ZAV::Util::runCommand for all callers.
bool runInventoryProgram(
    const String& command, int& rc, String& stdOut, String& stdErr, const String& input,
    bool nonBlocking) asm("__wrap__ZN3ZAV4Util10runCommandERKNS_6StringERiRS1_S5_S3_b");

bool runInventoryProgram(const String& /*command*/, int& rc, String& stdOut, String& stdErr,
                         const String& /*input*/, bool /*nonBlocking*/) {
    rc = 0;
    stdOut = report();
    stdErr.clear();
    return true;
}

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    ZAV_TOVRINHOME = "/opt/tovrin";
    fuzz::Input input(data, size);
    const String product = fuzz::stringOf(input.line());
    const String preferred = fuzz::stringOf(input.line());
    report() = fuzz::stringOf(input.rest());
    const std::u16string all = fuzz::unitsOf(report());

    const std::u16string single = fuzz::unitsOf(getProductArch(product));
    require(isToken(single, u"\n :"), "an architecture is one word");
    require(all.find(single) != std::u16string::npos, "an architecture stands in the report");

    const std::u16string listed = fuzz::unitsOf(getSharedLibArch(product, preferred));
    require(isToken(listed, u"\n\r,\""), "a platform is one field");
    require(all.find(listed) != std::u16string::npos, "a platform stands in the list");
    if (product == "ax") require(listed != u"aix433" && listed != u"hp102", "it can be used");

    const std::u16string directory = fuzz::unitsOf(getSharedLibArchDir());
    require(directory.empty() || directory.rfind(u"/opt/tovrin/agtqvs6/", 0) == 0,
            "the directory is the home's");
    fuzz::unitsOf(getProductArchDir(fuzz::stringOf(single), product));
    return 0;
}
