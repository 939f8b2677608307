#include "support/fake_sleep.h"

#include <mutex>

#include "platform/bss1.h"

namespace {

std::mutex& guard() {
    static std::mutex& instance = *new std::mutex;  // used by threads that outlive main
    return instance;
}

std::vector<unsigned>& record() {
    static std::vector<unsigned>& instance = *new std::vector<unsigned>;
    return instance;
}

}  // namespace

// The definition in the program comes before the platform library's.
void BSS1_Sleep(unsigned seconds) {
    const std::lock_guard<std::mutex> lock(guard());
    record().push_back(seconds);
}

namespace fake_sleep {

std::vector<unsigned> slept() {
    const std::lock_guard<std::mutex> lock(guard());
    return record();
}

void reset() {
    const std::lock_guard<std::mutex> lock(guard());
    record().clear();
}

}  // namespace fake_sleep
