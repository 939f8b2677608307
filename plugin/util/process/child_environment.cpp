#include "util/process/child_environment.h"

#include <algorithm>
#include <cstring>

namespace ZAV {
namespace {

/// Whether `entry` sets the variable whose name is the first `length` bytes of `name`.
bool sets(const char* entry, const char* name, std::size_t length) {
    return std::strncmp(entry, name, length) == 0 && entry[length] == '=';
}

}  // namespace

ChildEnvironment::ChildEnvironment(char* const* base) {
    for (; base != nullptr && *base != nullptr; ++base)
        entries_.push_back(*base);
    entries_.push_back(nullptr);
}

void ChildEnvironment::put(const char* setting) {
    const std::size_t length = std::strcspn(setting, "=");
    const bool removes = setting[length] == '\0';
    if (removes && length == 0) return;
    const auto last = entries_.end() - 1;
    const auto same = [&](const char* entry) { return sets(entry, setting, length); };
    if (removes) {
        entries_.erase(std::remove_if(entries_.begin(), last, same), last);
        return;
    }
    // execve takes a list of char* and changes none of the texts.
    char* const text = const_cast<char*>(setting);
    const auto found = std::find_if(entries_.begin(), last, same);
    if (found != last) {
        *found = text;
    } else {
        entries_.insert(last, text);
    }
}

const char* ChildEnvironment::find(const char* name) const {
    const std::size_t length = std::strlen(name);
    for (const char* entry : entries_) {
        if (entry != nullptr && sets(entry, name, length)) return entry + length + 1;
    }
    return nullptr;
}

}  // namespace ZAV
