// The command push: files into the host's depot.

#include <CLI/CLI.hpp>
#include <algorithm>
#include <cstdio>
#include <filesystem>
#include <memory>
#include <nlohmann/json.hpp>

#include "ctl/client/failure.h"
#include "ctl/client/options.h"
#include "ctl/client/pusher.h"
#include "ctl/show/rows.h"
#include "ctl/show/transfer_progress.h"
#include "ctl/verbs/commands.h"

namespace fs = std::filesystem;
using nlohmann::json;

namespace ctl {
namespace {

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
    std::uintmax_t taken = 0;
    for (const PushedFile& file : files) {
        taken += file.sent;
        list.push_back({{"name", file.name},
                        {"bytes", file.sent},
                        {"status", file.worst.status},
                        {"fault", file.worst.fault},
                        {"meaning", statusText(file.worst)}});
    }
    return {{"files", list}, {"bytes", taken}, {"seconds", progress.seconds()}};
}

int runPush(const Options& options, const std::string& source, const std::string& destination) {
    std::vector<PushedFile> files;
    try {
        files = filesToPush(source, destination);
    } catch (const fs::filesystem_error& error) {
        throw Failure(kWrongUsage,
                      "cannot read " + error.path1().string() + ": " + error.code().message());
    }
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
