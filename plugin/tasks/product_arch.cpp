#include "tasks/product_arch.h"

#include <algorithm>
#include <vector>

#include "base/zavtrace.h"
#include "tasks/home.h"
#include "util/process/report_scan.h"
#include "util/zavutil.h"

using ZAV::ReportBody;
using ZAV::String;
using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zavtasks"};

constexpr const char* kSharedComponent = "ax";

/// Runs the inventory program. Returns true, and what it printed, when it ran and succeeded.
bool runInventory(const String& options, String& report) {
    int exitCode = 0;
    String stdErr;
    return ZAV::Util::runCommand(String(ZAV_TOVRINHOME) + "/bin/cinfo" + options, exitCode, report,
                                 stdErr, "", false) &&
           exitCode == 0;
}

// ---- The report about one product ---------------------------------------------------------------

/// The architecture in a line such as "li6263 Product (ux)"; empty for a line about something else.
String archInReportLine(const String& line, const String& product) {
    const std::vector<String> words = ZAV::splitFields(line, "\n :");
    const bool matches =
        words.size() == 3 && words[1] == "Product" && words[2] == "(" + product + ")";
    return matches ? words[0] : String();
}

String archInProductReport(const String& report, const String& product) {
    Trace trace(traceUnit);
    constexpr const char* kHeader = "Platform codes:";
    const ReportBody body = ZAV::findReportBody(report, kHeader);
    if (body.header == String::NPOS) {
        trace().error("Product header string %s, not found", kHeader);
        return {};
    }
    trace().detail("Index of inventory header is %d", body.header);
    if (body.newline == String::NPOS) {
        trace().error("No newline character '%c' found after Product header", '\n');
        return {};
    }
    trace().detail("Index of newline after product header is : %d", body.newline);
    ZAV::TokenScanner lines(report, "\n", body.newline);
    for (String line; lines.next(line);) {
        trace().detail("Found product line: %s", line);
        const String architecture = archInReportLine(line, product);
        if (architecture.length() != 0) return architecture;
    }
    return {};
}

// ---- The list of all products -------------------------------------------------------------------

/// The fields of a line that are used here.
struct ListLine {
    String product;
    String platform;
};

bool parseListLine(const String& line, ListLine& parsed) {
    Trace trace(traceUnit);
    constexpr std::size_t kFields = 5;  // product, description, platform, version, release
    std::vector<String> fields = ZAV::splitFields(line, "\n\r,\"");
    if (fields.size() != kFields) {
        trace().error("Product line has %d fields, expecting %d fields.  Product line is: %s",
                      fields.size(), kFields, line);
        return trace.exit(false);
    }
    parsed.product = std::move(fields[0]);
    parsed.platform = std::move(fields[2]);
    return trace.exit(true);
}

/// The shared component cannot be used on these platforms, although it may be listed for them.
bool isUnusable(const ListLine& line) {
    static constexpr const char* kPlatforms[] = {"aix433", "hp102",  "sol273",
                                                 "sol276", "sol278", "sol288"};
    return line.product == kSharedComponent &&
           std::any_of(std::begin(kPlatforms), std::end(kPlatforms),
                       [&](const char* platform) { return line.platform == platform; });
}

/// Whether two platforms have the same length and the same last two characters.
bool endAlike(const String& platform, const String& preferred) {
    const std::uint32_t length = platform.length();
    return length >= 2 && length == preferred.length() &&
           platform[length - 1] == preferred[length - 1] &&
           platform[length - 2] == preferred[length - 2];
}

String archInList(const String& list, const String& product, const String& preferred) {
    Trace trace(traceUnit);
    constexpr const char* kHeader =
        "\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"";
    const ReportBody body = ZAV::findReportBody(list, kHeader);
    if (body.header == String::NPOS) {
        trace().error("Inventory header string %s, not found", kHeader);
        return {};
    }
    trace().detail("Index of inventory header is %d", body.header);
    if (body.newline == String::NPOS) {
        trace().error("No newline character '%c' found after Inventory header", '\n');
        return {};
    }
    trace().detail("Index of newline after inventory header is : %d", body.newline);
    String architecture;
    ListLine parsed;
    ZAV::TokenScanner lines(list, "\n", body.newline);
    for (String line; lines.next(line);) {
        trace().detail("Found product line: %s", line);
        if (!parseListLine(line, parsed) || parsed.product != product || isUnusable(parsed)) {
            continue;
        }
        architecture = parsed.platform;
        if (preferred.length() == 0 || endAlike(architecture, preferred)) break;
    }
    return architecture;
}

}  // namespace

String getProductArch(const String& product) {
    Trace trace(traceUnit);
    trace().detail("Looking for product code %s", product);
    String architecture;
    String report;
    if (runInventory(" -p " + product, report)) architecture = archInProductReport(report, product);
    trace().detail("Architecture for product code [%s] is [%s]", product, architecture);
    return architecture;
}

String getSharedLibArch(const String& product, const String& preferred) {
    Trace trace(traceUnit);
    trace().detail("Looking for product code %s", product);
    String architecture;
    String list;
    if (runInventory(" -d ", list)) {
        architecture = archInList(list, product, preferred);
    } else {
        trace().error("Bad return code from Util::runCommand");
    }
    trace().detail("Architecture for product code [%s] is [%s]", product, architecture);
    return architecture;
}

String getProductArchDir(const String& architecture, const String& product) {
    Trace trace(traceUnit);
    String directory;
    if (architecture.length() != 0 && product.length() != 0) {
        directory = String(ZAV_TOVRINHOME) + "/agtqvs6/" + architecture + "/" +
                    (product == kSharedComponent ? String("bin") : product);
    }
    trace().detail("Architecture directory for architecture [%s] product code [%s] is [%s]",
                   architecture, product, directory);
    return directory;
}

String getSharedLibArchDir() {
    Trace trace(traceUnit);
    const String architecture = getSharedLibArch(kSharedComponent, getSharedLibArch("lz", ""));
    String directory;
    if (architecture.length() != 0) {
        directory = String(ZAV_TOVRINHOME) + "/agtqvs6/" + architecture + "/bin";
    }
    trace().detail("Architecture directory for Shared Lib [%s] is is [%s]", kSharedComponent,
                   directory);
    return directory;
}
