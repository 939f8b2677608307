// Start-up parameters of the universal agent: only the instance's own lines of the file change. An
// input is a line with the parameters, a line with the instance and the file.

#include <unistd.h>

#include <algorithm>
#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>

#include "support/fuzz_support.h"
#include "tasks/ua_files.h"

using fuzz::require;

namespace {

/// A directory of this process's own, in memory where there is such a place.
class Scratch {
public:
    Scratch() {
        const bool inMemory = ::access("/dev/shm", W_OK) == 0;
        path_ = std::string(inMemory ? "/dev/shm" : "/tmp") + "/zavfuzz.XXXXXX";
        require(::mkdtemp(path_.data()) != nullptr, "a scratch directory can be made");
    }
    ~Scratch() {
        std::error_code ignored;
        std::filesystem::remove_all(path_, ignored);
    }
    Scratch(const Scratch&) = delete;
    Scratch& operator=(const Scratch&) = delete;

    std::string file() const { return path_ + "/um.config"; }

private:
    std::string path_;
};

std::string contentOf(const std::string& path) {
    std::ifstream in(path, std::ios::binary);
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

std::string expectedContent(std::string text, const std::string& parms, const std::string& marker) {
    text.erase(std::remove(text.begin(), text.end(), '\0'), text.end());
    std::string expected;
    for (std::size_t at = 0; at < text.size();) {
        const std::size_t end = std::min(text.find('\n', at), text.size());
        const std::string line = text.substr(at, end - at);
        at = end + 1;
        if (line.empty()) continue;
        expected += line.find(marker) == std::string::npos ? line : marker + parms + "|";
        expected += '\n';
    }
    return expected;
}

}  // namespace

extern "C" int LLVMFuzzerTestOneInput(const std::uint8_t* data, std::size_t size) {
    static const Scratch scratch;
    fuzz::Input input(data, size);
    const std::string parms = fuzz::upToZero(input.line());
    const std::string instance = fuzz::upToZero(input.line());
    const std::string content(input.rest());
    const std::string path = scratch.file();
    std::ofstream(path, std::ios::binary | std::ios::trunc) << content;

    const int changed =
        changeUaStartupParms(fuzz::stringOf(path), fuzz::stringOf(parms), fuzz::stringOf(instance));
    require(::access((path + ".copy").c_str(), F_OK) != 0, "no copy stays behind");
    const bool hasText = content.find_first_not_of('\0') != std::string::npos;
    require(changed == (hasText ? 1 : 0), "every text can be changed");
    if (!hasText || !fuzz::isAscii(content + parms + instance)) return 0;
    require(contentOf(path) == expectedContent(content, parms, instance + "|DATAPROVIDER|"),
            "only the instance's lines change");
    return 0;
}
