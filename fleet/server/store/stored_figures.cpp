#include "fleet/server/store/stored_figures.h"

#include "fleet/server/store/centre_directory.h"

namespace fleet {
namespace {

std::vector<StoredFigures::SeenHost> seenHosts(sqlite::Database& database) {
    std::vector<StoredFigures::SeenHost> hosts;
    sqlite::Statement rows = database.ask(kSeenHosts);
    while (rows.step()) {
        hosts.push_back(
            {rows.bytes(0), Moment(rows.integer(1)), rows.integer(2) != 0, rows.integer(3) != 0});
    }
    return hosts;
}

void countRollouts(sqlite::Database& database, StoredFigures& figures) {
    sqlite::Statement rows = database.ask(kCountRollouts);
    while (rows.step()) {
        const auto state = static_cast<RolloutState>(rows.integer(0));
        const auto count = static_cast<std::uint64_t>(rows.integer(2));
        figures.rollouts[state] += count;
        if (state == RolloutState::Paused) {
            figures.paused[static_cast<PauseCause>(rows.integer(1))] += count;
        }
    }
}

}  // namespace

StoredFiguresReader::StoredFiguresReader(const std::string& directory)
    : file_(CentreDirectory::databaseIn(directory)) {}

StoredFigures StoredFiguresReader::read(Moment now) {
    const std::lock_guard lock(mutex_);
    if (!connection_) {
        connection_ = std::make_unique<sqlite::Database>(file_);
        connection_->run("PRAGMA query_only = ON");
    }
    StoredFigures figures;
    figures.hosts = seenHosts(*connection_);
    figures.waiting = static_cast<std::uint64_t>(connection_->number(kCountWaiting));
    figures.open = static_cast<std::uint64_t>(connection_->number(kCountOpen));
    figures.unconfirmed = static_cast<std::uint64_t>(
        connection_->number(kCountUnconfirmed, std::int64_t{now.count()}));
    countRollouts(*connection_, figures);
    return figures;
}

}  // namespace fleet
