// What ras1.h promises: flags of units and trace lines.

#include "platform/ras1.h"

#include <sys/wait.h>
#include <unistd.h>

#include <algorithm>
#include <climits>
#include <string>
#include <thread>
#include <vector>

#include "conformance/rule.h"

namespace conformance {
namespace {

constexpr unsigned kAll = RAS1_DETAIL | RAS1_FLOW | RAS1_ERROR;

RAS1_UNIT unit{"conformance"};
const RAS1_BLOCK block{&unit, "checkedFunction"};

bool contains(const std::string& line, const std::string& part) {
    return line.find(part) != std::string::npos;
}

/// The one line that `write` makes.
template <typename Write>
std::string lineOf(Bench& bench, Write write) {
    const auto trace = bench.driver().captureTrace(Selection::Everything);
    write();
    const std::vector<std::string> lines = trace->lines();
    requireEqual(lines.size(), std::size_t{1}, "the number of lines");
    return lines[0];
}

void requireContains(const std::string& line, const std::string& part) {
    require(contains(line, part), shown(line) + " does not hold " + shown(part));
}

void requirePlace(const std::string& line) {
    requireContains(line, unit.name);
    requireContains(line, block.function);
    requireContains(line, "4711");
}

void generationIsNeverNull(Bench&) {
    require(RAS1_Generation.load() != 0, "is 0");
}

void generationGrowsWithTheSelection(Bench& bench) {
    const unsigned before = RAS1_Generation.load();
    const auto trace = bench.driver().captureTrace(Selection::Everything);
    require(RAS1_Generation.load() != before, "stayed the same");
}

void syncStoresWhatItReturns(Bench&) {
    static RAS1_UNIT fresh{"fresh"};
    const unsigned flags = RAS1_Sync(&fresh);
    requireEqual(fresh.flags.load(), flags, "the unit's flags");
    requireEqual(fresh.generation.load(), RAS1_Generation.load(), "the unit's generation");
}

void flagsFollowTheSelection(Bench& bench) {
    {
        const auto trace = bench.driver().captureTrace(Selection::ErrorsOnly);
        requireEqual(RAS1_Flags(unit), unsigned{RAS1_ERROR}, "the flags with errors selected");
    }
    const auto trace = bench.driver().captureTrace(Selection::Everything);
    requireEqual(RAS1_Flags(unit), kAll, "the flags with everything selected");
}

void entryNamesItsPlace(Bench& bench) {
    requirePlace(lineOf(bench, [] { RAS1_Entry(&block, 4711); }));
}

void exitNamesItsPlace(Bench& bench) {
    requirePlace(lineOf(bench, [] { RAS1_Exit(&block, 4711); }));
}

void exitValueCarriesTheResult(Bench& bench) {
    const std::string line = lineOf(bench, [] { RAS1_ExitValue(&block, 4711, LONG_MIN); });
    requirePlace(line);
    requireContains(line, std::to_string(LONG_MIN));
}

void printfFormats(Bench& bench) {
    const std::string line =
        lineOf(bench, [] { RAS1_Printf(&block, RAS1_ERROR, 4711, "%d files in %s", 3, "depot"); });
    requirePlace(line);
    requireContains(line, "3 files in depot");
}

void printfWritesDetails(Bench& bench) {
    requireContains(lineOf(bench, [] { RAS1_Printf(&block, RAS1_DETAIL, 1, "%s", "found"); }),
                    "found");
}

void printfTakesAnyLength(Bench& bench) {
    for (const std::size_t length : {0U, 1U, 1023U, 1024U, 1025U, 4096U, 100'000U}) {
        const std::string text = "<" + std::string(length, 'x') + ">";
        for (const char* const format : {"%s", "%s "}) {
            const std::string line = lineOf(bench, [&] {
                const std::string whole = format;
                if (whole == "%s") RAS1_Printf(&block, RAS1_ERROR, 1, "%s", text.c_str());
                if (whole != "%s") RAS1_Printf(&block, RAS1_ERROR, 1, "%s ", text.c_str());
            });
            require(contains(line, text),
                    "a text of " + std::to_string(text.size()) + " bytes is not whole");
        }
    }
}

void printfDoesNotMixThreads(Bench& bench) {
    const auto trace = bench.driver().captureTrace(Selection::Everything);
    const std::string text = "<" + std::string(300, 't') + ">";
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t) {
        threads.emplace_back([&] {
            for (int i = 0; i < 250; ++i)
                RAS1_Printf(&block, RAS1_DETAIL, 1, "%s", text.c_str());
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    const std::vector<std::string> lines = trace->lines();
    requireEqual(lines.size(), std::size_t{1000}, "the number of lines");
    require(std::all_of(lines.begin(), lines.end(),
                        [&](const std::string& line) { return contains(line, text); }),
            "a line is not whole");
}

void printfWorksAfterFork(Bench& bench) {
    const std::string line = lineOf(bench, [] {
        const pid_t child = ::fork();
        if (child == 0) {
            RAS1_Printf(&block, RAS1_DETAIL, 1, "%s", "in the child");
            ::_exit(0);
        }
        ::waitpid(child, nullptr, 0);
    });
    requireContains(line, "in the child");
}

}  // namespace

std::vector<Operation> ras1Operations() {
    return {
        {"RAS1_Generation",
         {{"is never 0", generationIsNeverNull},
          {"changes with the selection", generationGrowsWithTheSelection}}},
        {"RAS1_Sync",
         {{"stores what it returns", syncStoresWhatItReturns},
          {"follows the selection in force", flagsFollowTheSelection}}},
        {"RAS1_Entry", {{"writes a line that names its place", entryNamesItsPlace}}},
        {"RAS1_Exit", {{"writes a line that names its place", exitNamesItsPlace}}},
        {"RAS1_ExitValue", {{"writes a line with the result", exitValueCarriesTheResult}}},
        {"RAS1_Printf",
         {{"formats its arguments", printfFormats},
          {"writes details", printfWritesDetails},
          {"writes texts of any length whole", printfTakesAnyLength},
          {"does not mix the lines of threads", printfDoesNotMixThreads},
          {"works in a child between fork and exec", printfWorksAfterFork}}},
    };
}

}  // namespace conformance
