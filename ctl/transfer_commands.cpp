// The command push: files into the host's depot.

#include <fcntl.h>
#include <unistd.h>

#include <CLI/CLI.hpp>
#include <algorithm>
#include <cerrno>
#include <cstring>
#include <deque>
#include <filesystem>
#include <memory>
#include <nlohmann/json.hpp>

#include "ctl/commands.h"
#include "ctl/options.h"
#include "ctl/outcome.h"
#include "ctl/rows.h"
#include "ctl/terminal.h"
#include "ctl/transfer_client.h"

namespace fs = std::filesystem;
using nlohmann::json;

namespace ctl {
namespace {

struct PushedFile {
    fs::path source;
    std::string name;  ///< relative to the depot
    std::uintmax_t size = 0;
    std::uintmax_t sent = 0;
    TransferAnswer worst;  ///< the first batch that was not taken
};

std::string statusText(const TransferAnswer& answer) {
    if (answer.fault != 0) return rpc::faultText(answer.fault);
    switch (answer.status) {
        case 0:
            return "done";
        case 1:
            return "the host has no usable depot directory";
        case 3:
            return "the name is too long";
        case 4:
            return "the host could not open the file";
        case 5:
            return "the host could not write the file";
        case 6:
            return "the host could not make the file's directory";
        default:
            return "the host answered with status " + std::to_string(answer.status);
    }
}

class OpenFile {
public:
    explicit OpenFile(const fs::path& path)
        : descriptor_(::open(path.c_str(), O_RDONLY | O_CLOEXEC)) {
        if (descriptor_ == -1) {
            throw Failure(kWrongUsage,
                          "cannot open " + path.string() + ": " + std::strerror(errno));
        }
    }
    ~OpenFile() { ::close(descriptor_); }
    OpenFile(const OpenFile&) = delete;
    OpenFile& operator=(const OpenFile&) = delete;
    int get() const { return descriptor_; }

private:
    int descriptor_;
};

std::string withoutTrailingSlashes(std::string text) {
    while (text.size() > 1 && text.back() == '/')
        text.pop_back();
    return text;
}

/// "\" separates components on the wire, so a name that holds one would arrive as another.
void refuseBackslash(const std::string& name) {
    if (name.find('\\') != std::string::npos) {
        throw Failure(kWrongUsage, "a name with a backslash cannot be pushed: " + name);
    }
}

std::vector<PushedFile> filesOfFolder(const fs::path& folder, const std::string& destination) {
    std::vector<PushedFile> files;
    for (const auto& entry : fs::recursive_directory_iterator(folder)) {
        if (!entry.is_regular_file()) continue;
        const std::string relative = entry.path().lexically_relative(folder).generic_string();
        refuseBackslash(relative);
        files.push_back({entry.path(), destination + "/" + relative, entry.file_size(), 0, {}});
    }
    std::sort(files.begin(), files.end(),
              [](const PushedFile& a, const PushedFile& b) { return a.name < b.name; });
    return files;
}

std::vector<PushedFile> filesToPush(const std::string& source, std::string destination) {
    const fs::path path = withoutTrailingSlashes(source);
    std::error_code error;
    const fs::file_status found = fs::status(path, error);
    if (!fs::exists(found)) throw Failure(kWrongUsage, "there is no " + source);
    const std::string base = fs::absolute(path).filename().string();
    if (destination.empty()) {
        destination = base;
    } else if (destination.back() == '/') {
        destination += base;
    }
    if (fs::is_directory(found)) return filesOfFolder(path, withoutTrailingSlashes(destination));
    if (!fs::is_regular_file(found)) throw Failure(kWrongUsage, source + " is no regular file");
    refuseBackslash(base);
    return {{path, destination, fs::file_size(path), 0, {}}};
}

/// "12.3 MB" and the like.
std::string bytesText(double bytes) {
    static const char* const kUnits[] = {"B", "kB", "MB", "GB", "TB"};
    std::size_t unit = 0;
    while (bytes >= 1000 && unit + 1 < std::size(kUnits)) {
        bytes /= 1000;
        ++unit;
    }
    char text[32];
    std::snprintf(text, sizeof text, unit == 0 ? "%.0f %s" : "%.1f %s", bytes, kUnits[unit]);
    return text;
}

/// A bar on a terminal, redrawn a few times a second; nothing elsewhere.
class Progress {
public:
    Progress(std::uintmax_t total, bool enabled)
        : total_(total), enabled_(enabled && ::isatty(STDERR_FILENO) == 1) {}
    ~Progress() {
        if (drawn_) std::fputs("\r\033[K", stderr);
    }
    Progress(const Progress&) = delete;
    Progress& operator=(const Progress&) = delete;

    void add(std::uintmax_t bytes) {
        sent_ += bytes;
        const auto now = std::chrono::steady_clock::now();
        if (!enabled_ || now - lastDrawn_ < std::chrono::milliseconds(100)) return;
        lastDrawn_ = now;
        draw();
    }
    double seconds() const {
        return std::chrono::duration<double>(std::chrono::steady_clock::now() - start_).count();
    }
    std::uintmax_t sent() const { return sent_; }

private:
    void draw() {
        constexpr int kWidth = 30;
        const double share = total_ == 0 ? 1 : std::min(1.0, double(sent_) / double(total_));
        const double rate = double(sent_) / std::max(seconds(), 1e-6);
        const auto left = static_cast<long>((double(total_) - double(sent_)) / std::max(rate, 1.0));
        const std::string bar(static_cast<std::size_t>(share * kWidth), '#');
        std::fprintf(stderr, "\r[%-*s] %3.0f %%  %s of %s  %s/s  %ld s left\033[K", kWidth,
                     bar.c_str(), share * 100, bytesText(double(sent_)).c_str(),
                     bytesText(double(total_)).c_str(), bytesText(rate).c_str(), left);
        std::fflush(stderr);
        drawn_ = true;
    }

    std::uintmax_t total_;
    bool enabled_;
    bool drawn_ = false;
    std::uintmax_t sent_ = 0;
    std::chrono::steady_clock::time_point start_ = std::chrono::steady_clock::now();
    std::chrono::steady_clock::time_point lastDrawn_ = start_;
};

/// Sends files one behind the other over one association. Several batches are on their way at a
/// time, so that the host never waits for the next one.
class Pusher {
public:
    Pusher(const Options& options, Progress& progress)
        : client_(options.rpcSocket, options.timeout()), progress_(progress) {}

    void push(PushedFile& file) {
        const OpenFile input(file.source);
        bool first = true;
        std::size_t length = 0;
        do {
            length = batch_.read(input.get(), file.source.string());
            if (length == 0 && !first) break;
            client_.send(file.name, first, batch_);
            onTheirWay_.push_back({&file, length});
            // A file whose beginning was refused must not be appended to.
            awaitAnswers(first && length == kFull ? 0 : kMostOnTheirWay);
            if (file.worst.fault != 0 || file.worst.status != 0) break;
            first = false;
        } while (length == kFull);
    }

    void finish() { awaitAnswers(0); }

private:
    static constexpr std::size_t kFull = ChunkBatch::kMostChunks * 4096;
    // Small enough that the answers of all of them fit into the socket's buffer.
    static constexpr std::size_t kMostOnTheirWay = 64;

    struct Sent {
        PushedFile* file;
        std::size_t length;
    };

    void awaitAnswers(std::size_t remaining) {
        while (onTheirWay_.size() > remaining) {
            const TransferAnswer answer = client_.receive();
            const Sent sent = onTheirWay_.front();
            onTheirWay_.pop_front();
            const bool taken = answer.fault == 0 && answer.status == 0;
            PushedFile& file = *sent.file;
            if (taken) {
                file.sent += sent.length;
            } else if (file.worst.fault == 0 && file.worst.status == 0) {
                file.worst = answer;
            }
            progress_.add(sent.length);
        }
    }

    TransferClient client_;
    ChunkBatch batch_;
    Progress& progress_;
    std::deque<Sent> onTheirWay_;
};

bool wasTaken(const PushedFile& file) {
    return file.worst.fault == 0 && file.worst.status == 0;
}

void printReport(const std::vector<PushedFile>& files, const Progress& progress) {
    std::size_t failed = 0;
    for (const PushedFile& file : files) {
        if (wasTaken(file)) continue;
        ++failed;
        std::printf("%s: %s\n", file.name.c_str(), statusText(file.worst).c_str());
    }
    const double seconds = std::max(progress.seconds(), 1e-6);
    const std::string what =
        files.size() == 1 ? files[0].name : std::to_string(files.size()) + " files";
    if (failed == 0) {
        std::printf("push %s: done; %s in %.2f s, %s/s\n", what.c_str(),
                    bytesText(double(progress.sent())).c_str(), seconds,
                    bytesText(double(progress.sent()) / seconds).c_str());
    } else {
        std::printf("push %s: failed; %zu of %zu not taken\n", what.c_str(), failed, files.size());
    }
}

json reportDocument(const std::vector<PushedFile>& files, const Progress& progress) {
    json list = json::array();
    for (const PushedFile& file : files) {
        list.push_back({{"name", file.name},
                        {"bytes", file.sent},
                        {"status", file.worst.status},
                        {"fault", file.worst.fault},
                        {"meaning", statusText(file.worst)}});
    }
    return {{"files", list}, {"bytes", progress.sent()}, {"seconds", progress.seconds()}};
}

int runPush(const Options& options, const std::string& source, const std::string& destination) {
    std::vector<PushedFile> files = filesToPush(source, destination);
    if (files.empty()) throw Failure(kWrongUsage, source + " holds no files");
    std::uintmax_t total = 0;
    for (const PushedFile& file : files)
        total += file.size;
    Progress progress(total, !options.json);
    {
        Pusher pusher(options, progress);
        for (PushedFile& file : files)
            pusher.push(file);
        pusher.finish();
    }
    const bool allTaken = std::all_of(files.begin(), files.end(), wasTaken);
    if (options.json) {
        printJson(reportDocument(files, progress));
    } else {
        printReport(files, progress);
    }
    return allTaken ? kSuccess : kHostReportedFailure;
}

}  // namespace

void addTransferCommands(CLI::App& app, const Options& options, int& status) {
    auto source = std::make_shared<std::string>();
    auto destination = std::make_shared<std::string>();
    CLI::App* push =
        app.add_subcommand("push", "Send a file, or a folder file by file, to the depot");
    push->add_option("FILE", *source, "File or folder")->required();
    push->add_option(
        "DEST", *destination,
        "Name in the depot; the file's own if not given, and below it if it ends in /");
    push->callback([=, &options, &status] { status = runPush(options, *source, *destination); });
}

}  // namespace ctl
