/// Conversion between the code page that tables speak and the UTF-8 of JSON.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace host {

/// Immutable; may be used by several threads at once.
class CodePage {
public:
    /// `name` as the C library's converter knows it. Throws StartError when it does not.
    explicit CodePage(std::string name);
    /// The code page of the process's locale.
    static CodePage ofProcess();

    const std::string& name() const { return name_; }
    /// Never fails: what is no character, such as a sequence that was cut at a column's end,
    /// becomes U+FFFD.
    std::string toUtf8(std::string_view text) const;
    /// Nothing when `text` is not UTF-8 or has a character that this code page lacks.
    std::optional<std::string> fromUtf8(std::string_view text) const;

private:
    std::string name_;
};

}  // namespace host
