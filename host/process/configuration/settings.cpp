#include "host/process/configuration/settings.h"

#include <utility>

namespace host {
namespace {

bool isInFile(const Setting* setting) {
    return setting != nullptr && !setting->file.empty();
}

std::string placeOf(const Setting& setting) {
    return setting.file + ":" + std::to_string(setting.line);
}

}  // namespace

void Settings::add(const std::string& name, Setting setting) {
    settings_.emplace(name, std::move(setting));
}

void Settings::add(const Settings& others) {
    settings_.insert(others.settings_.begin(), others.settings_.end());
}

const Setting* Settings::find(const std::string& name) const {
    const auto found = settings_.find(name);
    return found == settings_.end() ? nullptr : &found->second;
}

std::optional<std::string> Settings::text(const std::string& name) const {
    const Setting* const setting = find(name);
    return setting == nullptr ? std::nullopt : std::optional<std::string>(setting->text);
}

bool Settings::flag(const std::string& name) const {
    return text(name) == "true";
}

std::string Settings::where(const std::string& name) const {
    const Setting* const setting = find(name);
    return isInFile(setting) ? placeOf(*setting) + ": " : "";
}

std::string Settings::label(const std::string& name) const {
    return isInFile(find(name)) ? where(name) + name : "--" + name;
}

std::string Settings::source(const std::string& name) const {
    const Setting* const setting = find(name);
    if (setting == nullptr) return "";
    return isInFile(setting) ? placeOf(*setting) : "command line";
}

}  // namespace host
