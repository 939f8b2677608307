// What ncs.h promises: the registration of interfaces, and memory for stubs.

#include "platform/ncs.h"

#include <atomic>
#include <cstddef>
#include <cstring>
#include <future>
#include <string>
#include <thread>
#include <vector>

#include "conformance/rule.h"

namespace conformance {
namespace {

constexpr std::size_t kKiB = 1024;
constexpr std::size_t kMiB = 1024 * kKiB;

constexpr uuid__t kInterface = {0x5A415643, 0x4F4E, 0x4601, 0x81, {2, 3, 4, 5, 6, 7, 8}};
constexpr uuid__t kOtherInterface = {0x5A415643, 0x4F4E, 0x4602, 0x81, {2, 3, 4, 5, 6, 7, 8}};

/// What a stub saw of the last call.
struct Seen {
    std::atomic<int> calls{0};
    const void* manager = nullptr;
    std::size_t capacity = 0;
    bool hasHandle = false;
};
Seen seen;

/// Answers with the request's bytes turned round.
std::uint32_t turnStub(const rpc__request* request, const void* manager, rpc__reply* reply) {
    seen.manager = manager;
    seen.capacity = reply->capacity;
    seen.hasHandle = request->handle != nullptr;
    ++seen.calls;
    if (request->length > reply->capacity) return rpc__s_no_memory;
    for (std::size_t i = 0; i < request->length; ++i)
        reply->data[i] = request->data[request->length - 1 - i];
    reply->length = request->length;
    return rpc__s_ok;
}

std::uint32_t failingStub(const rpc__request*, const void*, rpc__reply* reply) {
    reply->length = 0;
    return rpc__s_bad_stub_data;
}

/// Answers with the number of bytes that came, in four bytes.
std::uint32_t countStub(const rpc__request* request, const void*, rpc__reply* reply) {
    for (std::size_t i = 0; i < 4; ++i)
        reply->data[i] = static_cast<unsigned char>(request->length >> (8 * i));
    reply->length = 4;
    return rpc__s_ok;
}

constexpr rpc__server_stub kStubs[] = {turnStub, failingStub, countStub};
constexpr rpc__server_epv kVector = {kStubs, 3};
constexpr rpc__if_spec kSpecification = {"conformance", kInterface, 1, 3};

/// Numbers of the interface's operations; the last is one that it does not have.
constexpr std::uint16_t kTurn = 0, kFail = 1, kCount = 2, kNone = 3;

void offer(const void* manager = nullptr) {
    std::uint32_t status = 1;
    rpc__register_mgr(&uuid__nil, &kSpecification, &kVector, manager, &status);
    requireEqual(status, std::uint32_t{rpc__s_ok}, "the status of the registration");
}

/// What the stub saw; the count is read first, because the stub writes it last.
const Seen& lastCall() {
    require(seen.calls.load() > 0, "the stub was not called");
    return seen;
}

CallResult call(Bench& bench, std::uint16_t operation, const std::string& parameters = "") {
    return bench.driver().call(kInterface, 1, operation, parameters);
}

void nilIsZeros(Bench&) {
    static constexpr unsigned char kZeros[16] = {};
    static_assert(sizeof uuid__nil == sizeof kZeros);
    require(std::memcmp(&uuid__nil, kZeros, sizeof kZeros) == 0, "has bytes that are not 0");
}

void offersTheInterface(Bench& bench) {
    offer();
    const CallResult result = call(bench, kTurn, "abc");
    requireEqual(result.fault, std::uint32_t{0}, "the fault");
    requireEqual(result.results, "cba", "the reply");
}

void refusesWhatDoesNotFit(Bench&) {
    static constexpr rpc__if_spec kTwoOperations = {"conformance", kInterface, 1, 2};
    std::uint32_t status = 0;
    rpc__register_mgr(&uuid__nil, &kTwoOperations, &kVector, nullptr, &status);
    require(status != rpc__s_ok, "took stubs of another number");
    status = 0;
    rpc__register_mgr(&uuid__nil, nullptr, &kVector, nullptr, &status);
    require(status != rpc__s_ok, "took no interface");
    status = 0;
    rpc__register_mgr(&uuid__nil, &kSpecification, nullptr, nullptr, &status);
    require(status != rpc__s_ok, "took no stubs");
}

void handsTheManagerOn(Bench& bench) {
    static const int manager = 0;
    offer(&manager);
    call(bench, kTurn);
    require(lastCall().manager == &manager, "the stub got another one");
}

void replacesAnEarlierRegistration(Bench& bench) {
    static const int managers[2] = {};
    offer(&managers[0]);
    offer(&managers[1]);
    call(bench, kTurn);
    require(lastCall().manager == &managers[1], "the stub got the earlier manager");
}

void describesTheCall(Bench& bench) {
    offer();
    call(bench, kTurn);
    require(lastCall().capacity >= 4096, "there is room for fewer than 4096 bytes");
    require(lastCall().hasHandle, "there is no caller");
}

void passesFaultsOn(Bench& bench) {
    offer();
    requireEqual(call(bench, kFail).fault, std::uint32_t{rpc__s_bad_stub_data}, "the fault");
    requireEqual(call(bench, kTurn, "ab").results, "ba", "the reply of the next call");
}

void refusesUnknownOperations(Bench& bench) {
    offer();
    requireEqual(call(bench, kNone).fault, std::uint32_t{rpc__s_op_range}, "the fault");
}

void refusesUnknownInterfaces(Bench& bench) {
    offer();
    requireEqual(bench.driver().call(kOtherInterface, 1, kTurn, "").fault,
                 std::uint32_t{rpc__s_unknown_if}, "the fault for another interface");
    requireEqual(bench.driver().call(kInterface, 2, kTurn, "").fault,
                 std::uint32_t{rpc__s_unknown_if}, "the fault for another version");
}

void gathersLargeRequests(Bench& bench) {
    offer();
    const std::string expected("\0\0\x10\0", 4);
    requireEqual(call(bench, kCount, std::string(kMiB, 'x')).results, expected,
                 "the number of bytes");
}

void servesSeveralAtOnce(Bench& bench) {
    offer();
    Driver& driver = bench.driver();
    std::vector<std::future<CallResult>> callers;
    for (int i = 0; i < 4; ++i) {
        callers.push_back(std::async(std::launch::async, [&driver] {
            return driver.call(kInterface, 1, kCount, std::string(5000, 'x'));
        }));
    }
    for (std::future<CallResult>& caller : callers)
        requireEqual(caller.get().results, std::string("\x88\x13\0\0", 4), "an answer");
}

void givesAlignedMemory(Bench&) {
    for (const std::size_t size : {std::size_t{0}, std::size_t{1}, 32 * kKiB, 32 * kKiB + 1,
                                   64 * kKiB, 4 * kMiB, 4 * kMiB + 1, 9 * kMiB}) {
        void* const block = rpc__malloc(size);
        require(block != nullptr, "no block of " + std::to_string(size) + " bytes");
        require(reinterpret_cast<std::uintptr_t>(block) % alignof(std::max_align_t) == 0,
                "a block of " + std::to_string(size) + " bytes is not aligned");
        std::memset(block, 'x', size);
        rpc__free(block);
    }
}

void saysWhenThereIsNone(Bench&) {
    require(rpc__malloc(static_cast<std::size_t>(-1)) == nullptr, "gave all there is and more");
    require(rpc__malloc(static_cast<std::size_t>(-1) - 1000) == nullptr,
            "gave nearly all there is");
}

void servesSeveralThreads(Bench&) {
    std::atomic<int> wrong{0};
    std::vector<std::thread> threads;
    for (int t = 0; t < 4; ++t) {
        threads.emplace_back([&wrong, t] {
            for (int i = 0; i < 500; ++i) {
                const std::size_t size = (std::size_t{64} << (i % 4)) * kKiB;
                auto* const block = static_cast<char*>(rpc__malloc(size));
                block[0] = block[size - 1] = static_cast<char>(t);
                std::this_thread::yield();
                if (block[0] != t || block[size - 1] != t) ++wrong;
                rpc__free(block);
            }
        });
    }
    for (std::thread& thread : threads)
        thread.join();
    requireEqual(wrong.load(), 0, "the number of blocks with two owners");
}

void freesNothingQuietly(Bench&) {
    rpc__free(nullptr);
}

void copiesSoManyBytes(Bench&) {
    char to[4] = "abc";
    rpc__block_copy("xyz", to, 2);
    requireEqual(to, std::string("xyc"), "the target");
    rpc__block_copy("xyz", to, 0);
    requireEqual(to, std::string("xyc"), "the target after 0 bytes");
}

}  // namespace

std::vector<Operation> ncsOperations() {
    return {
        {"uuid__nil", {{"is all zeros", nilIsZeros}}},
        {"rpc__register_mgr",
         {{"offers the interface to callers", offersTheInterface},
          {"refuses what does not fit together", refusesWhatDoesNotFit},
          {"hands the manager to the stubs", handsTheManagerOn},
          {"replaces an earlier registration", replacesAnEarlierRegistration},
          {"tells the stub of its caller and its room", describesTheCall},
          {"passes a stub's fault on", passesFaultsOn},
          {"refuses operations that there are not", refusesUnknownOperations},
          {"refuses interfaces and versions that there are not", refusesUnknownInterfaces},
          {"has large requests put together", gathersLargeRequests},
          {"has several calls served at once", servesSeveralAtOnce}}},
        {"rpc__malloc",
         {{"gives memory aligned for any type", givesAlignedMemory},
          {"gives null when there is none", saysWhenThereIsNone},
          {"serves several threads", servesSeveralThreads}}},
        {"rpc__free", {{"ignores null", freesNothingQuietly}}},
        {"rpc__block_copy", {{"copies so many bytes", copiesSoManyBytes}}},
    };
}

}  // namespace conformance
