/// Code pages for the XML parser: its texts are converted to the local code page, and it learns to
/// read encodings that expat does not know itself.
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

/// Converts expat's UTF-8 to the code page of the process's default locale. Not to be shared
/// between threads.
class LocalText {
public:
    LocalText();
    /// True when texts need no conversion.
    bool isUtf8() const { return codepage_ == NLS2_CP_UTF8; }
    /// True when bytes above 127 mean something else in the local code page than in UTF-8, so that
    /// a document without a declared encoding has to be read in it.
    bool readsItself() const;
    /// Appends well-formed UTF-8 in the local code page. Throws std::bad_alloc.
    void append(std::string_view utf8, std::string& out);

private:
    const DefaultLocale locale_;
    int codepage_ = NLS2_CP_UTF8;
    bool keepsAscii_ = false;           ///< ASCII characters are the same bytes in the code page
    std::vector<unsigned short> wide_;  ///< scratch space, kept to save allocations
};

/// The encoding name that stands for the local code page.
constexpr const char* kLocalEncoding = "x-local-code-page";

/// Expat's handler for encodings that it does not know: the local code page, and whatever the C
/// library can convert in which a character has one to three bytes. `data` is not used.
int describeEncoding(void* data, const XML_Char* name, XML_Encoding* encoding);

}  // namespace xml1
