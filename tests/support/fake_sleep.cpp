#include "support/fake_sleep.h"

#include <mutex>
#include <utility>

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

std::function<void()>& happeningAsleep() {
    static std::function<void()>& instance = *new std::function<void()>;
    return instance;
}

}  // namespace

// The definition in the program comes before the platform library's.
void BSS1_Sleep(unsigned seconds) {
    std::function<void()> happening;
    {
        const std::lock_guard<std::mutex> lock(guard());
        record().push_back(seconds);
        happening = happeningAsleep();
    }
    if (happening) happening();
}

namespace fake_sleep {

std::vector<unsigned> slept() {
    const std::lock_guard<std::mutex> lock(guard());
    return record();
}

void whileAsleep(std::function<void()> happening) {
    const std::lock_guard<std::mutex> lock(guard());
    happeningAsleep() = std::move(happening);
}

void reset() {
    const std::lock_guard<std::mutex> lock(guard());
    record().clear();
    happeningAsleep() = nullptr;
}

}  // namespace fake_sleep
