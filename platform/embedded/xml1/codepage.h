/// The code page side of the XML parser: texts out of it in the local code page, and input
/// encodings that the parser itself does not know.
#pragma once

#include <expat.h>

#include <memory>
#include <string>
#include <string_view>
#include <vector>

#include "platform/nls2.h"

namespace xml1 {

struct LocaleCloser {
    void operator()(NLS2_LOCALE* locale) const { NLS2_ReleaseLocale(locale); }
};
using DefaultLocale = std::unique_ptr<NLS2_LOCALE, LocaleCloser>;

/// Turns the parser's UTF-8 into the code page of the process's default locale. One parser's own.
class LocalText {
public:
    LocalText();
    /// True when texts can be handed on as they are.
    bool isUtf8() const { return codepage_ == NLS2_CP_UTF8; }
    /// True when bytes above 127 have a meaning in the local code page that differs from UTF-8's.
    bool readsItself() const;
    /// Appends well-formed UTF-8 in the local code page. Throws std::bad_alloc.
    void append(std::string_view utf8, std::string& out);

private:
    const DefaultLocale locale_;
    int codepage_ = NLS2_CP_UTF8;
    std::vector<unsigned short> wide_;  ///< kept for its memory
};

/// The name under which the parser is told to read the local code page.
constexpr const char* kLocalEncoding = "x-local-code-page";

/// The parser's handler for encodings beyond those built into it: the local code page, and what the
/// C library can convert, as far as one to three bytes make a character. `data` is not used.
int describeEncoding(void* data, const XML_Char* name, XML_Encoding* encoding);

}  // namespace xml1
