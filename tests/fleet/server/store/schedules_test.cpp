/// Random schedules of a fleet in which everything goes wrong, over the database that ships.
#include <gtest/gtest.h>

#include <cstdint>
#include <memory>

#include "tests/fleet/model/world.h"
#include "tests/fleet/server/store/sqlite_model_store.h"

namespace {

constexpr std::uint64_t kSchedules = 13;  // of each of 16 kinds

class StoreSchedules : public testing::TestWithParam<unsigned> {};

TEST_P(StoreSchedules, EndEveryOrderOnceAndAsTheJournalSays) {
    const unsigned kind = GetParam();
    model::Disasters disasters;
    disasters.journals = (kind & 1U) != 0;
    disasters.links = (kind & 2U) != 0;
    disasters.power = (kind & 4U) != 0;
    disasters.backups = (kind & 8U) != 0;
    const model::MakeStore makeStore = [](model::Dice& dice) {
        return std::make_unique<model::SqliteModelStore>(dice);
    };
    const std::uint64_t first = 1'000'000 * (kind + 1) + 500'000;
    for (std::uint64_t seed = first; seed < first + kSchedules; ++seed) {
        model::World world(seed, disasters, makeStore);
        world.run(400);
        ASSERT_EQ(world.fault(), "") << "seed " << seed;
    }
}

INSTANTIATE_TEST_SUITE_P(Kinds, StoreSchedules, testing::Range(0U, 16U));

}  // namespace
