// The driver of the embedded platform.

#include <fcntl.h>
#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <mutex>
#include <optional>
#include <stdexcept>
#include <utility>

#include "conformance/driver.h"
#include "conformance/embedded/dce_client.h"
#include "embedded/ncs_host.h"
#include "embedded/oxa_host.h"
#include "embedded/ras1_control.h"

namespace {

using namespace conformance;

std::vector<oxa::Predicate> predicates(const Conditions& where) {
    std::vector<oxa::Predicate> all;
    for (const Condition& condition : where)
        all.push_back({condition.column, condition.op, condition.value});
    return all;
}

Rows split(const oxa::Rows& rows) {
    Rows all;
    for (std::size_t i = 0; i < rows.count(); ++i)
        all.emplace_back(rows.row(i), rows.rowSize);
    return all;
}

class LiveSubscription final : public Subscription {
public:
    explicit LiveSubscription(std::unique_ptr<oxa::Subscription> live) : live_(std::move(live)) {}

private:
    const std::unique_ptr<oxa::Subscription> live_;
};

/// Sends the trace to a file while it exists.
class FileCapture final : public TraceCapture {
public:
    explicit FileCapture(const std::string& selection) {
        path_ = (std::filesystem::temp_directory_path() / "zavconformance-trace.XXXXXX").string();
        const int file = ::mkostemp(path_.data(), O_CLOEXEC);
        if (file == -1) throw std::runtime_error("no file for the trace can be made");
        ::close(file);
        ras1::configure(selection, path_);
    }
    ~FileCapture() override {
        ras1::configureFromEnvironment();
        ::unlink(path_.c_str());
    }
    std::vector<std::string> lines() override {
        std::vector<std::string> all;
        std::ifstream file(path_);
        for (std::string line; std::getline(file, line);)
            all.push_back(line);
        return all;
    }

private:
    std::string path_;
};

class EmbeddedDriver final : public Driver {
public:
    Answer query(const std::string& table, const Conditions& where) override {
        oxa::Rows rows;
        const int status = oxa::query(table, predicates(where), rows);
        return {status, split(rows)};
    }
    std::unique_ptr<Subscription> subscribe(const std::string& table, const Conditions& where,
                                            Sink sink) override {
        auto live = oxa::subscribe(
            table, predicates(where),
            [sink = std::move(sink)](const oxa::Rows& rows) { return sink(split(rows)); });
        return live ? std::make_unique<LiveSubscription>(std::move(live)) : nullptr;
    }
    CallResult call(const uuid__t& interface, std::uint32_t version, std::uint16_t operation,
                    const std::string& parameters) override {
        std::call_once(started_, [this] { port_ = server_.emplace().listenOnLoopback(0); });
        return DceClient(port_, interface, version).call(operation, parameters);
    }
    std::unique_ptr<TraceCapture> captureTrace(Selection selection) override {
        return std::make_unique<FileCapture>(selection == Selection::Everything ? "ALL" : "ERROR");
    }

private:
    // Without calls there are no threads of the runtime.
    std::once_flag started_;
    std::optional<ncs::Server> server_;
    std::uint16_t port_ = 0;
};

}  // namespace

std::unique_ptr<Driver> conformance::makeDriver() {
    return std::make_unique<EmbeddedDriver>();
}
