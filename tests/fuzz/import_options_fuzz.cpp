// The guard's reading of a universal agent's import: it finds the port that the plug-in will take,
// and the holder of a port in any start-up parameters. An input is a line with the options, a line
// with the instance and the parameters.

#include <algorithm>
#include <vector>

#include "base/zavtoken.h"
#include "host/guard/machine/import_options.h"
#include "support/fuzz_support.h"

using fuzz::require;
using ZAV::String;

namespace {

/// The port that the plug-in's own texts make of the options; empty when there is none.
std::string portOf(const std::string& options) {
    String context = fuzz::stringOf(options);
    context.trim().toUpper();
    String port;
    for (StringTokenizer each(context, ","); each.hasMoreTokens();) {
        const String option = each.nextToken();
        const std::uint32_t separator = option.find("=", 0);
        if (option.find("PORT=", 0) == String::NPOS || separator + 1 == option.length()) continue;
        port = option.substr(separator + 1);
    }
    return fuzz::narrow(port);
}

void checkNumber(const std::string& text) {
    const int number = host::portNumber(text);
    require(number >= 0 && number <= 65535, "a port is in its range");
    if (number == 0) return;
    const std::size_t zeros = text.find_first_not_of('0');
    require(text.substr(zeros) == std::to_string(number), "a port is its digits");
}

void checkOptions(const std::string& options) {
    const std::vector<std::string> ports = host::portsIn(options);
    for (const std::string& port : ports) {
        require(!port.empty() && port.find(',') == std::string::npos, "a port is one option's");
        checkNumber(port);
    }
    if (!fuzz::isAscii(options)) return;
    require(portOf(options) == (ports.empty() ? "" : ports.back()), "the plug-in takes the last");
}

/// Whoever holds the port is named in a line that ends in it.
void checkHolder(const std::string& instance, const std::string& parameters) {
    for (const std::size_t at : {parameters.find("PORT|"), parameters.rfind("PORT|")}) {
        if (at == std::string::npos) continue;
        const std::size_t begin = at + 5;
        const std::size_t end = std::min(parameters.find_first_of("|\n", begin), parameters.size());
        const int port = host::portNumber(parameters.substr(begin, end - begin));
        if (port == 0) continue;
        const std::string holder = host::holderOfPort(parameters, port, instance);
        const bool isNamed = holder == "the default instance" || holder.rfind("instance ", 0) == 0;
        require(holder.empty() || isNamed, "a holder has a name");
        require(holder != "instance " + instance, "nobody stands in his own way");
    }
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    fuzz::Input input(data, size);
    const std::string options = fuzz::upToZero(input.line());
    const std::string instance(input.line());
    checkNumber(options);
    checkOptions(options);
    checkHolder(instance, std::string(input.rest()));
    return 0;
}
