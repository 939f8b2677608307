#include "host/checks/lossy_path.h"

#include <cstddef>

#include "host/tables/code_page.h"
#include "host/tables/narrow_text.h"

namespace host {

std::optional<Finding> lossOf(const std::string& path) {
    const CodePage codePage = CodePage::ofProcess();
    const std::size_t cut = bytesCut(path, codePage);
    if (cut > 0) {
        return Finding{Verdict::Error,
                       path +
                           " cannot be used: it has letters outside ASCII, for which the "
                           "plug-in cuts its command lines at their end, here by at least " +
                           std::to_string(cut) + (cut == 1 ? " byte" : " bytes"),
                       "use a path of ASCII letters"};
    }
    if (bytesBeyondUnits(path, codePage) == 0) return std::nullopt;
    return Finding{Verdict::Warning,
                   path +
                       " has a letter outside ASCII; the plug-in cuts a byte off the end of "
                       "command lines in which the path stands twice",
                   "use a path of ASCII letters"};
}

}  // namespace host
