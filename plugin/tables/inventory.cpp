#include "tables/inventory.h"

#include <string>
#include <unordered_set>
#include <utility>
#include <vector>

#include "base/zavtrace.h"
#include "util/process/report_scan.h"

using ZAV::String;
using ZAV::Trace;

namespace {

RAS1_UNIT traceUnit{"zav03agt"};

constexpr const char* kProbeHeader = "ArchitectureHeader";
constexpr std::size_t kProbeTokens = 3;
constexpr const char* kInventoryHeader =
    "\"ProdCode\",\"Description\",\"Platform\",\"Version\",\"Release\"";
constexpr const char* kFieldDelimiters = "\n\r,\"";
constexpr std::size_t kProductFields = 5;

/// The position of the first product line; String::NPOS when there is none.
std::uint32_t startOfProductLines(const String& inventory) {
    Trace trace(traceUnit);
    const ZAV::ReportBody body = ZAV::findReportBody(inventory, kInventoryHeader);
    if (body.header == String::NPOS) {
        trace().error("Inventory header string %s, not found", kInventoryHeader);
        return trace.exit(String::NPOS);
    }
    trace().detail("Index of inventory header is %d", body.header);
    if (body.newline == String::NPOS) {
        trace().error("No newline character '%c' found after Inventory header", '\n');
        return trace.exit(String::NPOS);
    }
    trace().detail("Index of newline after inventory header is : %d", body.newline);
    return trace.exit(body.newline);
}

/// In versions of eight characters the last number has one digit fewer than the table shows.
String shownVersion(const String& version) {
    if (version.length() != 8) return version;
    return version.substr(0, 6) + "0" + version.substr(6, 2);
}

/// Returns false, with a trace line, when the line has too few fields. Ignores extra ones.
bool parseProductLine(const String& line, InstalledProduct& product) {
    Trace trace(traceUnit);
    std::vector<String> fields = ZAV::splitFields(line, kFieldDelimiters);
    if (fields.size() < kProductFields) {
        trace().error("Product line has %d fields, expecting %d fields.  Product line is: %s",
                      fields.size(), kProductFields, line);
        return trace.exit(false);
    }
    product.code = std::move(fields[0]);
    product.description = std::move(fields[1]);
    product.platform = std::move(fields[2]);
    product.version = shownVersion(fields[3]);
    product.release = std::move(fields[4]);
    return trace.exit(true);
}

/// Two lines with the same key, all fields joined, are duplicates.
std::u16string keyOf(const InstalledProduct& product) {
    std::u16string key;
    for (const String* field : {&product.code, &product.description, &product.platform,
                                &product.version, &product.release}) {
        key.append(field->getData(), field->getData() + field->length());
    }
    return key;
}

}  // namespace

String architectureProbeCommand(const String& home) {
    return String("/bin/ksh") + " " + "-c" + " '" + ". " + home + "/bin/dynarch.shl" + " " + home +
           "/registry/archdsc.tbl" + " >" + "/dev/null" + " 2>&1;echo " + kProbeHeader +
           ";echo $os;echo $cArch" + "'";
}

HostArchitecture parseArchitectureProbe(const String& output) {
    Trace trace(traceUnit);
    const std::uint32_t header = output.find(String(kProbeHeader), 0);
    if (header == String::NPOS) {
        trace().error("Could not find header %s in output", kProbeHeader);
        return {};
    }
    const std::vector<String> tokens = ZAV::splitFields(output, "\n", header);
    if (tokens.size() != kProbeTokens) {
        trace().error("Expected 3 tokens, Header and $os and $cArch, but we got %d tokens",
                      tokens.size());
        for (const String& token : tokens)
            trace().error("Received token ***%s***", token);
        return {};
    }
    trace().detail("$os = %s, $cArch = %s", tokens[1], tokens[2]);
    return {tokens[1], tokens[2]};
}

String inventoryCommand(const String& home) {
    return home + "/" + "bin" + "/" + "cinfo" + " " + "-d";
}

int forEachProduct(const String& inventory,
                   const std::function<int(const InstalledProduct& product)>& take) {
    Trace trace(traceUnit);
    const std::uint32_t start = startOfProductLines(inventory);
    if (start == String::NPOS) return trace.exit(0);

    std::unordered_set<std::u16string> seen;
    ZAV::TokenScanner lines(inventory, "\n", start);
    InstalledProduct product;
    for (String line; lines.next(line);) {
        trace().detail("Found product line: %s", line);
        if (!parseProductLine(line, product)) continue;
        if (!seen.insert(keyOf(product)).second) {
            trace().detail("skipping duplicate info in this line");
            continue;
        }
        const int status = take(product);
        if (status != 0) return trace.exit(status);
    }
    return trace.exit(0);
}
