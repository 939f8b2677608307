#include "host/process/children/process_table.h"

#include <fcntl.h>
#include <unistd.h>

#include <algorithm>
#include <array>
#include <charconv>
#include <string>

#include "host/process/system/directory_stream.h"
#include "system/file_descriptor.h"

namespace host {
namespace {

/// Takes the next field off a text whose fields blanks separate.
std::string_view takeField(std::string_view& text) {
    text.remove_prefix(std::min(text.find_first_not_of(' '), text.size()));
    const std::string_view field = text.substr(0, text.find(' '));
    text.remove_prefix(field.size());
    return field;
}

template <typename Number>
Number statNumber(std::string_view text) {
    Number number = 0;
    std::from_chars(text.data(), text.data() + text.size(), number);
    return number;
}

std::optional<ProcessEntry> readEntry(const std::string& pid) {
    const std::string path = "/proc/" + pid + "/stat";
    const sys::FileDescriptor file(::open(path.c_str(), O_RDONLY | O_CLOEXEC));
    if (!file) return std::nullopt;
    std::array<char, 1024> text{};
    const ssize_t length = ::read(file.get(), text.data(), text.size());
    if (length <= 0) return std::nullopt;
    return processIn({text.data(), static_cast<std::size_t>(length)});
}

}  // namespace

std::vector<ProcessEntry> readProcesses() {
    std::vector<ProcessEntry> processes;
    const DirectoryStream directory(::opendir("/proc"));
    if (directory == nullptr) return processes;
    while (const dirent* const entry = ::readdir(directory.get())) {
        if (entry->d_name[0] < '1' || entry->d_name[0] > '9') continue;
        if (const auto process = readEntry(entry->d_name)) processes.push_back(*process);
    }
    return processes;
}

std::optional<ProcessEntry> readProcess(pid_t pid) {
    return readEntry(std::to_string(pid));
}

std::size_t countLivingChildren() {
    const pid_t self = ::getpid();
    const std::vector<ProcessEntry> processes = readProcesses();
    return static_cast<std::size_t>(std::count_if(
        processes.begin(), processes.end(),
        [self](const ProcessEntry& process) { return process.parent == self && process.isAlive; }));
}

std::optional<ProcessEntry> processIn(std::string_view stat) {
    // The second field is the program's name, which may hold blanks and parentheses.
    const std::size_t nameEnd = stat.rfind(')');
    if (nameEnd == std::string_view::npos) return std::nullopt;
    ProcessEntry process;
    process.pid = statNumber<pid_t>(stat);
    std::string_view rest = stat.substr(nameEnd + 1);
    const std::string_view state = takeField(rest);
    process.isAlive = state != "Z" && state != "X" && state != "x";
    process.parent = statNumber<pid_t>(takeField(rest));
    takeField(rest);  // the process group
    process.session = statNumber<pid_t>(takeField(rest));
    constexpr int kFieldsBeforeStart = 15;
    for (int i = 0; i < kFieldsBeforeStart; ++i)
        takeField(rest);
    const std::string_view start = takeField(rest);
    if (start.empty() || process.pid <= 0) return std::nullopt;
    process.start = statNumber<unsigned long long>(start);
    return process;
}

}  // namespace host
