#include "fleet/link/metrics/metrics_file.h"

#include <unistd.h>

#include <utility>

#include "fleet/files/file_error.h"
#include "fleet/files/files.h"
#include "fleet/log/log.h"

namespace fleet {

MetricsFile::~MetricsFile() {
    if (!path_.empty()) ::unlink(path_.c_str());
}

void MetricsFile::write(const LinkScrape& scrape, Clock::time_point now) {
    next_ = now + kPause;
    std::string trouble;
    try {
        replaceFile(path_, metrics::pageOf(linkMetricTable(), scrape), Secrecy::Public);
    } catch (const FileError& error) {
        trouble = error.what();
    }
    if (std::exchange(trouble_, trouble) == trouble || trouble.empty()) return;
    say(Priority::Warning, "metrics are not written: " + trouble);
}

}  // namespace fleet
