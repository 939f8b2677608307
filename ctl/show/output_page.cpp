#include "ctl/show/output_page.h"

#include <unistd.h>

#include "ctl/show/printable.h"

namespace ctl {

Page outputPage(const std::string& stream, const std::string& text, Format format) {
    const bool isError = stream == "stderr" || format == Format::Json;
    const bool isTerminal = ::isatty(isError ? STDERR_FILENO : STDOUT_FILENO) == 1;
    const std::string shown = isTerminal ? printableLines(text) : text;
    Page page;
    (isError ? page.err : page.out) = shown;
    page.isVerbatim = true;
    return page;
}

}  // namespace ctl
