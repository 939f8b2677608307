/// Conversion between the code page that tables speak and the UTF-8 of JSON.
#pragma once

#include <optional>
#include <string>
#include <string_view>

namespace host {

/// Immutable; may be used by several threads at once.
class CodePage {
public:
    /// `name` as the C library's converters call it; throws std::runtime_error when there is none.
    explicit CodePage(std::string name);
    /// The code page of the process's locale.
    static CodePage ofProcess();

    const std::string& name() const { return name_; }
    /// Never fails: bytes that are no character, such as a sequence cut at a column's end, become
    /// U+FFFD.
    std::string toUtf8(std::string_view text) const;
    /// Returns nothing when `text` is not UTF-8 or holds a character that this code page lacks.
    std::optional<std::string> fromUtf8(std::string_view text) const;

private:
    std::string name_;
    bool keepsPlain_ = false;  ///< printable ASCII is the same bytes in it
};

}  // namespace host
