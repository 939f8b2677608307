/// Ten thousand random schedules of a fleet in which everything is lost, killed, late or put back.
/// The link and the centre are the product's own decisions.
#include <gtest/gtest.h>

#include <cstdint>
#include <cstdlib>
#include <string>

#include "tests/fleet/model/world.h"

namespace {

using model::Disasters;
using model::World;

constexpr std::uint64_t kSchedules = 1'000;

/// Runs schedules of one kind; each kind has seeds of its own.
void runSchedules(Disasters disasters, std::uint64_t firstSeed) {
    for (std::uint64_t seed = firstSeed; seed < firstSeed + kSchedules; ++seed) {
        World world(seed, disasters);
        world.run(400);
        ASSERT_EQ(world.fault(), "") << "seed " << seed;
    }
}

Disasters disastersOf(unsigned kind) {
    Disasters disasters;
    disasters.journals = (kind & 1U) != 0;
    disasters.links = (kind & 2U) != 0;
    disasters.power = (kind & 4U) != 0;
    disasters.backups = (kind & 8U) != 0;
    return disasters;
}

class ProtocolModel : public testing::TestWithParam<unsigned> {};

TEST_P(ProtocolModel, EndsEveryOrderOnceAndAsTheJournalSays) {
    runSchedules(disastersOf(GetParam()), 1'000'000 * (GetParam() + 1));
}

INSTANTIATE_TEST_SUITE_P(Kinds, ProtocolModel, testing::Range(0U, 16U));

}  // namespace
