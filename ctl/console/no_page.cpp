// The page of a build that has none.

#include "ctl/console/embedded_page.h"

namespace console {

std::vector<PageFile> embeddedPage() {
    return {};
}

}  // namespace console
