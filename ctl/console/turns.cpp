#include "ctl/console/turns.h"

#include <utility>

namespace console {
namespace {

constexpr int kMostReads = 12;

}  // namespace

std::shared_ptr<void> Turns::beginRead() {
    return *reads_ < kMostReads ? counted(reads_) : nullptr;
}

std::shared_ptr<void> Turns::beginChange() {
    return counted(changes_);
}

/// Counts while it lives, copies included.
std::shared_ptr<void> Turns::counted(Count count) {
    ++*count;
    std::atomic<int>* const counter = count.get();
    return {counter, [count = std::move(count)](void*) { --*count; }};
}

}  // namespace console
