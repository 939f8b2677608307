// Splits the RESERVED column.
#include "base/zavtoken.h"
#include "base/zavtrace.h"
#include "util/zavutil.h"

namespace ZAV {
namespace {

RAS1_UNIT traceUnit{"zavcustk"};

constexpr int kProducts = 3;
constexpr int kTokensOfProduct = 3;

bool beginsWith(const String& text, const char* letter) {
    return text.find(String(letter), 0) == 0;
}

String withoutDots(const String& version) {
    return String::replace(version, ".", "");
}

/// The caller's variables.
struct Outputs {
    String& agentLevel;
    String& agentArch;
    String& axVersion;
    String& axArch;
    String& commonVersion;
};

/// Splits one product's entry into its two values; traces `complaint` when one is missing.
bool splitProduct(Trace& trace, const String& product, const char* complaint, String& first,
                  String& second) {
    StringTokenizer tokens(product, "=:");
    const int count = tokens.countTokens();
    if (count != kTokensOfProduct) {
        trace().error(complaint, count);
        return false;
    }
    tokens.nextToken();
    first = tokens.nextToken();
    second = tokens.nextToken();
    return true;
}

/// Stores one product's values; false when the entry is malformed or its product unknown.
bool parseProduct(Trace& trace, const String& product, const Outputs& out) {
    String first;
    String second;
    if (beginsWith(product, "A")) {
        if (!splitProduct(trace, product, "wrong number of tokens in A product:%d", first, second))
            return false;
        out.agentLevel = first;
        out.agentArch = second;
        trace().detail("agentLevel=%s,agentArch=%s", out.agentLevel, out.agentArch);
        return true;
    }
    if (beginsWith(product, "C")) {
        if (!splitProduct(trace, product, "wrong number of tokens in C product:%d", first, second))
            return false;
        out.axVersion = withoutDots(first);
        out.axArch = second;
        trace().detail("axVersion=%s,axArch=%s", out.axVersion, out.axArch);
        return true;
    }
    if (beginsWith(product, "G")) {
        if (!splitProduct(trace, product, "wrong number of tokens in G product:%d", first, second))
            return false;
        out.commonVersion = withoutDots(first);
        trace().detail("commonVersion=%s", out.commonVersion);
        return true;
    }
    trace().error("unknown product in RESERVED column");
    return false;
}

}  // namespace

bool Util::parseReserved(const String& reserved, String& agentLevel, String& agentArch,
                         String& axVersion, String& axArch, String& commonVersion) {
    Trace trace(traceUnit);
    trace().detail("reserved=[%s]", reserved);
    StringTokenizer products(reserved, ";");
    const int count = products.countTokens();
    if (count != kProducts) {
        trace().error("wrong number of products in RESERVED column:%d", count);
        return trace.exit(false);
    }
    const Outputs out{agentLevel, agentArch, axVersion, axArch, commonVersion};
    while (products.hasMoreTokens()) {
        if (!parseProduct(trace, products.nextToken(), out)) return trace.exit(false);
    }
    return trace.exit(true);
}

}  // namespace ZAV
