#include "ctl/show/tasks/output_page.h"

#include <unistd.h>

#include "ctl/show/printable.h"

namespace ctl {

Page OutputPages::next(const std::string& stream, const std::string& text) {
    const bool isError = stream == "stderr";
    const std::string shown = (isError ? err_ : out_).feed(text);
    const bool goesToError = isError || format_ == Format::Json;
    const bool isTerminal = ::isatty(goesToError ? STDERR_FILENO : STDOUT_FILENO) == 1;
    Page page;
    (goesToError ? page.err : page.out) = isTerminal ? printableLines(shown) : shown;
    page.isVerbatim = true;
    return page;
}

}  // namespace ctl
