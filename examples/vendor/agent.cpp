// A tiny agent process with the management plug-in built in. It starts one product and says how
// that ended:
//
//   vendor-agent HOME PRODUCT
//
// VENDOR_LOG names the log socket (/dev/log unless it is set), VENDOR_TRACE=all traces everything.

#include <condition_variable>
#include <cstdint>
#include <cstdio>
#include <cstring>
#include <exception>
#include <mutex>
#include <string>

#include "mgmt/zavmgmt.h"
#include "own_platform/tables.h"
#include "own_platform/trace.h"
#include "platform/bss1.h"

namespace {

constexpr const char* kTransaction = "VENDOR-1";

/// Waits for the outcome that the plug-in's executor hands over.
class Outcome {
public:
    int take(const vendor::Rows& rows) {
        const std::lock_guard<std::mutex> guard(lock_);
        row_ = rows.back();
        arrived_.notify_all();
        return OXA_OK;
    }
    std::string wait() {
        std::unique_lock<std::mutex> guard(lock_);
        arrived_.wait(guard, [this] { return !row_.empty(); });
        return row_;
    }

private:
    std::mutex lock_;
    std::condition_variable arrived_;
    std::string row_;
};

std::string field(const std::string& table, const std::string& row, const std::string& name) {
    for (const vendor::Column& column : vendor::columnsOf(table)) {
        if (column.name != name) continue;
        const std::string bytes = row.substr(static_cast<std::size_t>(column.offset),
                                             static_cast<std::size_t>(column.length));
        if (column.type == OXA_TYPE_INTEGER) {
            std::int32_t number = 0;
            std::memcpy(&number, bytes.data(), sizeof number);
            return std::to_string(number);
        }
        return bytes.substr(0, bytes.find_last_not_of(' ') + 1);
    }
    return {};
}

/// Prints a row's outcome; true for success.
bool print(const char* what, const std::string& table, const std::string& row) {
    const std::string result = field(table, row, "RETVAL");
    std::string text = std::string(what) + ": " + field(table, row, "COMMAND") + " " +
                       field(table, row, "TRANSID") + " RETVAL=" + result;
    for (const char* const name : {"RETMSGID", "RETMSGPARM"}) {
        const std::string more = field(table, row, name);
        if (!more.empty()) text += " " + more;
    }
    std::puts(text.c_str());
    return result == "0";
}

int start(const std::string& product) {
    // The subscription comes first: the outcome may be there before the reply is printed.
    Outcome outcome;
    const auto live =
        vendor::subscribe("KAGDYST", {{"TRANSID", OPER_EQ, kTransaction}},
                          [&](const vendor::Rows& rows) { return outcome.take(rows); });
    vendor::Rows reply;
    const int status = vendor::query("KAGREQT",
                                     {{"COMMAND", OPER_EQ, "START"},
                                      {"PRODUCT", OPER_EQ, product},
                                      {"TRANSID", OPER_EQ, kTransaction}},
                                     reply);
    if (live == nullptr || status != OXA_OK || reply.empty()) {
        std::fprintf(stderr, "vendor-agent: the request failed with status %d\n", status);
        return 1;
    }
    if (!print("reply", "KAGREQT", reply[0])) return 1;
    return print("outcome", "KAGDYST", outcome.wait()) ? 0 : 1;
}

int run(const std::string& home, const std::string& product) {
    vendor::setTrace(BSS1_GetEnv("VENDOR_LOG", "/dev/log"),
                     std::string(BSS1_GetEnv("VENDOR_TRACE", "")) == "all");
    BSS1_PutEnv(("TOVRINHOME=" + home).c_str());
    const int status = Initialize_Mgmt_Functions();
    if (status != 0) {
        std::fprintf(stderr, "vendor-agent: the plug-in did not start: %d\n", status);
        return 1;
    }
    return start(product);
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 3) {
        std::fputs("usage: vendor-agent HOME PRODUCT\n", stderr);
        return 2;
    }
    try {
        return run(argv[1], argv[2]);
    } catch (const std::exception& failure) {
        std::fprintf(stderr, "vendor-agent: %s\n", failure.what());
        return 1;
    }
}
