/// Base services: trace.
///
/// Every source unit has one RAS1_UNIT with static storage, every function call one RAS1_BLOCK on
/// its stack. A caller reads the unit's flags first, so that a line which is not selected costs one
/// comparison. All operations may be called from any thread and, with the format "%s", from a
/// child between fork and exec.
#pragma once

#include <atomic>

/// Bits of a unit's flags and, one at a time, the level of a line.
enum : unsigned {
    RAS1_DETAIL = 1,   ///< what a function found and did
    RAS1_FLOW = 64,    ///< entry to and exit from functions
    RAS1_ERROR = 128,  ///< failures; on by default
};

/// One source unit. Constant-initialised, so that static initialisers of other units may trace.
struct RAS1_UNIT {
    const char* name;                     ///< such as "zavtasks"; units are selected by name
    std::atomic<unsigned> flags{0};       ///< owned by the platform
    std::atomic<unsigned> generation{0};  ///< owned by the platform; 0 = flags not known yet

    constexpr explicit RAS1_UNIT(const char* unitName) : name(unitName) {}
};

/// One function call.
struct RAS1_BLOCK {
    const RAS1_UNIT* unit;
    const char* function;
};

extern "C" {

/// Grows by one whenever the selection of units changes; never 0. Read through RAS1_Flags.
extern std::atomic<unsigned> RAS1_Generation;

/// Determines the unit's flags from the selection in force, stores and returns them.
unsigned RAS1_Sync(RAS1_UNIT* unit);

/// Writes an entry event. `line` is the line number in the source unit.
void RAS1_Entry(const RAS1_BLOCK* block, int line);

/// Writes an exit event of a function without a result.
void RAS1_Exit(const RAS1_BLOCK* block, int line);

/// Writes an exit event that carries the function's result.
void RAS1_ExitValue(const RAS1_BLOCK* block, int line, long value);

/// Writes one line at `level` (RAS1_DETAIL or RAS1_ERROR). The caller has tested the unit's flags;
/// they are not tested again. The text may have any length.
void RAS1_Printf(const RAS1_BLOCK* block, unsigned level, int line, const char* format, ...)
    __attribute__((format(printf, 4, 5)));

}  // extern "C"

/// The unit's current flags.
inline unsigned RAS1_Flags(RAS1_UNIT& unit) {
    const bool changed = unit.generation.load(std::memory_order_acquire) !=
                         RAS1_Generation.load(std::memory_order_relaxed);
    if (__builtin_expect(changed, false)) return RAS1_Sync(&unit);
    return unit.flags.load(std::memory_order_relaxed);
}
