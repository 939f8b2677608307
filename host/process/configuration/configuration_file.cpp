#include "host/process/configuration/configuration_file.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cerrno>
#include <cstddef>
#include <cstdint>
#include <map>
#include <optional>
#include <string_view>
#include <system_error>
#include <utility>
#include <vector>

// Only this unit parses TOML: the library's headers are all of it.
#define TOML_HEADER_ONLY 1
#define TOML_ENABLE_FORMATTERS 0
#include <toml++/toml.h>

#include "host/process/configuration/option_table.h"
#include "host/process/start_error.h"
#include "host/process/system/trusted_file.h"
#include "system/file_descriptor.h"
#include "text/nearest_name.h"

namespace host {
namespace {

/// Far more than all options need.
constexpr std::size_t kLongestFile = std::size_t{1} << 20;

[[noreturn]] void refuseFile(const std::string& path, const std::string& why) {
    throw StartError("configuration " + path + ": " + why);
}

[[noreturn]] void refuseLine(const std::string& path, int line, const std::string& why) {
    throw StartError(path + ":" + std::to_string(line) + ": " + why);
}

/// Looks at the open file, so that nobody can put another in its place in between. It does not wait
/// for a pipe's other end.
sys::FileDescriptor openTrusted(const std::string& path) {
    sys::FileDescriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC | O_NONBLOCK | O_NOCTTY));
    struct stat found {};
    if (!file || ::fstat(file.get(), &found) != 0) {
        refuseFile(path, std::generic_category().message(errno));
    }
    if (!S_ISREG(found.st_mode)) refuseFile(path, "is no plain file");
    if (!isTrusted(found)) {
        refuseFile(
            path,
            "others own it or may write to it; give it to the host's user or to root, and take "
            "the write permission from group and others (chmod go-w)");
    }
    return file;
}

std::string readTrusted(const std::string& path) {
    const sys::FileDescriptor file = openTrusted(path);
    std::string content(kLongestFile + 1, '\0');
    std::size_t length = 0;
    while (length < content.size()) {
        const ssize_t got = ::read(file.get(), &content[length], content.size() - length);
        if (got < 0 && errno == EINTR) continue;
        if (got < 0) refuseFile(path, std::generic_category().message(errno));
        if (got == 0) break;
        length += static_cast<std::size_t>(got);
    }
    if (length > kLongestFile) refuseFile(path, "is longer than 1 MiB");
    content.resize(length);
    return content;
}

std::string nearestKey(const std::string& key) {
    std::vector<std::string> names;
    for (const OptionRow& row : optionTable()) {
        if (row.place == OptionPlace::Anywhere) names.emplace_back(row.name);
    }
    return text::nearestName(key, names);
}

const OptionRow& optionOf(const std::string& path, int line, const std::string& key) {
    const OptionRow* const row = findOption(key);
    if (row == nullptr) {
        const std::string nearest = nearestKey(key);
        refuseLine(path, line,
                   "there is no option \"" + key + "\"" +
                       (nearest.empty() ? "" : "; did you mean " + nearest + "?"));
    }
    if (row->place == OptionPlace::CommandLineOnly) {
        refuseLine(path, line, key + " belongs on the command line");
    }
    return *row;
}

const char* wordFor(OptionKind kind) {
    switch (kind) {
        case OptionKind::Text:
            return "a text in quotes";
        case OptionKind::Number:
            return "a whole number without quotes";
        case OptionKind::Flag:
            break;
    }
    return "true or false";
}

/// Nothing if the value is of another kind.
std::optional<std::string> textOf(const toml::node& value, OptionKind kind) {
    if (kind == OptionKind::Text) return value.value_exact<std::string>();
    if (kind == OptionKind::Number) {
        const std::optional<std::int64_t> number = value.value_exact<std::int64_t>();
        return number ? std::optional(std::to_string(*number)) : std::nullopt;
    }
    const std::optional<bool> isSet = value.value_exact<bool>();
    return isSet ? std::optional<std::string>(*isSet ? "true" : "false") : std::nullopt;
}

Setting settingOf(const std::string& path, int line, const std::string& key,
                  const toml::node& value) {
    const OptionRow& row = optionOf(path, line, key);
    const std::optional<std::string> text = textOf(value, row.kind);
    if (!text) refuseLine(path, line, key + " takes " + wordFor(row.kind));
    if (text->find('\0') != std::string::npos) {
        refuseLine(path, line, key + " holds a null character");
    }
    return {*text, path, line};
}

toml::table parseToml(const std::string& path, const std::string& content) {
    try {
        return toml::parse(std::string_view(content));
    } catch (const toml::parse_error& error) {
        refuseLine(path, static_cast<int>(error.source().begin.line),
                   std::string(error.description()));
    }
}

}  // namespace

Settings readConfigurationFile(const std::string& path) {
    const toml::table table = parseToml(path, readTrusted(path));
    // The table is in the order of the alphabet; the first complaint is about the first bad line.
    std::map<int, std::pair<std::string, const toml::node*>> lines;
    for (const auto& [key, value] : table) {
        lines.emplace(static_cast<int>(key.source().begin.line),
                      std::pair(std::string(key.str()), &value));
    }
    Settings settings;
    for (const auto& [line, item] : lines)
        settings.add(item.first, settingOf(path, line, item.first, *item.second));
    return settings;
}

}  // namespace host
