// How a link's configuration is written. Reading it has a source of its own, because the parser's
// headers take long to compile.

#include <cstdio>
#include <string>

#include "fleet/link/program/link_configuration.h"

namespace fleet {
namespace {

/// As a TOML text in quotes.
std::string quoted(const std::string& text) {
    std::string out = "\"";
    for (const char c : text) {
        const auto byte = static_cast<unsigned char>(c);
        if (c == '"' || c == '\\') {
            out += '\\';
            out += c;
        } else if (byte < 0x20 || byte == 0x7f) {
            char escape[8];
            std::snprintf(escape, sizeof escape, "\\u%04x", static_cast<unsigned>(byte));
            out += escape;
        } else {
            out += c;
        }
    }
    return out + '"';
}

std::string lineWith(const char* name, const std::string& text) {
    return text.empty() ? "" : std::string(name) + " = " + quoted(text) + '\n';
}

std::string listed(const std::vector<std::string>& texts) {
    std::string out;
    for (const std::string& text : texts)
        out += (out.empty() ? "" : ", ") + quoted(text);
    return '[' + out + ']';
}

}  // namespace

std::string linkConfigurationText(const LinkConfiguration& configuration) {
    std::string text =
        lineWith("fleet", configuration.fleet) + lineWith("name", configuration.name) +
        "bus = " + listed(configuration.bus) + '\n' + lineWith("ca", configuration.ca) +
        lineWith("server-name", configuration.serverName) + lineWith("url", configuration.url) +
        lineWith("root", configuration.root) + "centre = " + listed(configuration.centres) + '\n' +
        lineWith("host-socket", configuration.hostSocket) + lineWith("state", configuration.state) +
        lineWith("metrics", configuration.metrics);
    if (!configuration.labels.empty()) text += "\n[labels]\n";
    for (const auto& [name, value] : configuration.labels)
        text += quoted(name) + " = " + quoted(value) + '\n';
    return text;
}

}  // namespace fleet
