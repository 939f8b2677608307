#include "fleet/link/program/link_configuration.h"

#include <functional>
#include <optional>
#include <string_view>
#include <utility>

// Only this unit parses TOML: the library's headers are all of it.
#define TOML_HEADER_ONLY 1
#define TOML_ENABLE_FORMATTERS 0
#include <toml++/toml.h>

#include "fleet/bus/accounts/nkey.h"
#include "fleet/files/file_error.h"
#include "fleet/https/client/server_url.h"

namespace fleet {
namespace {

/// Where a value stands, for messages.
struct Place {
    const std::string& path;
    std::string name;
    int line;

    [[noreturn]] void refuse(const std::string& why) const {
        throw FileError(path + ":" + std::to_string(line) + ": " + name + ' ' + why);
    }
};

std::string wordIn(const toml::node& value, const Place& place) {
    const std::optional<std::string> text = value.value_exact<std::string>();
    if (!text) place.refuse("must be a text in quotes");
    if (text->empty()) place.refuse("must not be empty");
    return *text;
}

std::vector<std::string> textsOf(const toml::node& value, const Place& place) {
    const toml::array* const list = value.as_array();
    if (list == nullptr || list->empty()) place.refuse("must be a list of texts");
    std::vector<std::string> texts;
    for (const toml::node& text : *list)
        texts.push_back(wordIn(text, place));
    return texts;
}

Labels labelsOf(const toml::node& value, const Place& place) {
    const toml::table* const table = value.as_table();
    if (table == nullptr) place.refuse("must be a table of texts");
    Labels labels;
    for (const auto& [name, label] : *table) {
        const Place where{place.path, "label " + std::string(name.str()),
                          static_cast<int>(label.source().begin.line)};
        labels[std::string(name.str())] = wordIn(label, where);
    }
    return labels;
}

std::string checkedKey(std::string key, const Place& place, KeyKind kind) {
    if (!isPublicKey(key, kind)) place.refuse("is no public key of that kind");
    return key;
}

/// One key as a text, or a list of them: while the centre's key is replaced there are two.
std::vector<std::string> keysOf(const toml::node& value, const Place& place, KeyKind kind) {
    if (value.is_string()) return {checkedKey(wordIn(value, place), place, kind)};
    std::vector<std::string> keys;
    for (std::string& key : textsOf(value, place))
        keys.push_back(checkedKey(std::move(key), place, kind));
    return keys;
}

bool staysHere(const std::string& address) {
    for (const char* const host : {"nats://127.0.0.1:", "nats://localhost:", "nats://[::1]:"}) {
        const std::string_view start(host);
        if (address.rfind(start, 0) != 0) continue;
        // Nothing but a port: what stands before an "@" would be a password.
        const std::string port = address.substr(start.size());
        return !port.empty() && port.find_first_not_of("0123456789") == std::string::npos;
    }
    return false;
}

std::vector<std::string> addressesOf(const toml::node& value, const Place& place) {
    std::vector<std::string> addresses = textsOf(value, place);
    for (const std::string& address : addresses) {
        if (address.rfind("tls://", 0) == 0 || staysHere(address)) continue;
        place.refuse(
            "must name servers as tls://HOST:PORT; only this machine may be reached "
            "without encryption, as nats://127.0.0.1:PORT");
    }
    return addresses;
}

bool endsWith(std::string_view text, std::string_view end) {
    return text.size() >= end.size() && text.substr(text.size() - end.size()) == end;
}

struct Member {
    const char* name;
    bool isNeeded;
    void (*read)(const toml::node& value, const Place& place, LinkConfiguration& into);
};

template <std::string LinkConfiguration::*kMember>
void readText(const toml::node& value, const Place& place, LinkConfiguration& into) {
    into.*kMember = wordIn(value, place);
}

constexpr Member kMembers[] = {
    {"fleet", true, readText<&LinkConfiguration::fleet>},
    {"name", true, readText<&LinkConfiguration::name>},
    {"bus", true,
     [](const toml::node& value, const Place& place, LinkConfiguration& into) {
         into.bus = addressesOf(value, place);
     }},
    {"ca", false, readText<&LinkConfiguration::ca>},
    {"server-name", false, readText<&LinkConfiguration::serverName>},
    {"url", false,
     [](const toml::node& value, const Place& place, LinkConfiguration& into) {
         into.url = wordIn(value, place);
         try {
             readServerUrl(into.url);
         } catch (const UrlError& error) {
             place.refuse(std::string("must be the centre's URL: ") + error.what());
         }
     }},
    {"root", true,
     [](const toml::node& value, const Place& place, LinkConfiguration& into) {
         into.root = checkedKey(wordIn(value, place), place, KeyKind::Operator);
     }},
    {"centre", true,
     [](const toml::node& value, const Place& place, LinkConfiguration& into) {
         into.centres = keysOf(value, place, KeyKind::User);
     }},
    {"host-socket", false, readText<&LinkConfiguration::hostSocket>},
    {"state", true, readText<&LinkConfiguration::state>},
    {"metrics", false,
     [](const toml::node& value, const Place& place, LinkConfiguration& into) {
         into.metrics = wordIn(value, place);
         // The node exporter passes over other names.
         const bool isRead = endsWith(into.metrics, ".prom");
         if (into.metrics.front() != '/' || !isRead) place.refuse("must be a path /.../NAME.prom");
     }},
    {"labels", false,
     [](const toml::node& value, const Place& place, LinkConfiguration& into) {
         into.labels = labelsOf(value, place);
     }},
};

const Member* memberOf(std::string_view name) {
    for (const Member& member : kMembers) {
        if (name == member.name) return &member;
    }
    return nullptr;
}

toml::table parsed(const std::string& text, const std::string& path) {
    try {
        return toml::parse(text, path);
    } catch (const toml::parse_error& error) {
        throw FileError(path + ":" + std::to_string(error.source().begin.line) + ": " +
                        std::string(error.description()));
    }
}

void insistOnTrust(const LinkConfiguration& read, const std::string& path) {
    if (!read.url.empty() && read.ca.empty()) {
        throw FileError(path + ": \"ca\" is missing, the file with whom to trust");
    }
    for (const std::string& address : read.bus) {
        if (address.rfind("tls://", 0) != 0) continue;
        if (read.ca.empty())
            throw FileError(path + ": \"ca\" is missing, the file with whom to trust");
        if (read.serverName.empty()) throw FileError(path + ": \"server-name\" is missing");
    }
}

}  // namespace

LinkConfiguration parseLinkConfiguration(const std::string& text, const std::string& path) {
    const toml::table table = parsed(text, path);
    LinkConfiguration read;
    for (const auto& [key, value] : table) {
        const std::string name(key.str());
        const Place place{path, '"' + name + '"', static_cast<int>(value.source().begin.line)};
        const Member* const member = memberOf(name);
        if (member == nullptr) place.refuse("is nothing that a link knows");
        member->read(value, place, read);
    }
    for (const Member& member : kMembers) {
        if (member.isNeeded && !table.contains(member.name)) {
            throw FileError(path + ": \"" + member.name + "\" is missing");
        }
    }
    insistOnTrust(read, path);
    return read;
}

}  // namespace fleet
