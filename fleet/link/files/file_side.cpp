#include "fleet/link/files/file_side.h"

#include <exception>
#include <utility>

#include "fleet/log/log.h"

namespace fleet {
FileSide::FileSide(FileSideSettings settings)
    : settings_(std::move(settings)),
      spool_(settings_.spool, wallClock()),
      source_(settings_.source, [this] { return !isEnding_ && !(isPatient_ && wanted_ > 0); }),
      depot_(settings_.hostSocket) {}

FileSide::~FileSide() {
    isEnding_ = true;
    worker_.await();
}

void FileSide::fetchAhead(const Directive& directive) {
    if (wanted_ > 0 || isAhead_.exchange(true)) return;
    worker_.add([this, directive] {
        isPatient_ = true;
        try {
            spool_.sweep(wallClock());
            for (const OrderFile& file : directive.files)
                source_.fetch(file, spool_);
        } catch (const std::exception& error) {
            say(Priority::Info, "order " + std::to_string(directive.number) +
                                    ": its files do not come yet: " + error.what());
        }
        isPatient_ = false;
        isAhead_ = false;
    });
}

void FileSide::prepare(const Directive& directive, std::function<void(PrepareAnswer)> answer) {
    ++wanted_;
    worker_.add([this, directive, answer = std::move(answer)] {
        PrepareAnswer told = prepared(directive);
        --wanted_;
        if (!isEnding_) answer(std::move(told));
    });
}

PrepareAnswer FileSide::prepared(const Directive& directive) {
    try {
        for (const OrderFile& file : directive.files)
            source_.fetch(file, spool_);
        PrepareAnswer answer = depot_.place(directive.files, spool_);
        if (std::holds_alternative<NotNow>(answer)) return answer;
        for (const OrderFile& file : directive.files)
            spool_.forget(file.sha256);
        return answer;
    } catch (const std::exception& error) {
        // The centre, the network or the disk: none of them says anything about the order.
        return NotNow{error.what()};
    }
}

}  // namespace fleet
