#include "host/process/plugin_loader.h"

#include <dlfcn.h>
#include <unistd.h>

#include <filesystem>
#include <system_error>

#include "host/process/start_error.h"

namespace host {
namespace {

namespace fs = std::filesystem;

/// Builds and development packages have the plain name. A package for running alone may have only
/// the name with the version.
constexpr const char* kLibraries[] = {"libzavmgmt.so", "libzavmgmt.so.1"};
constexpr const char* kStartFunction = "Initialize_Mgmt_Functions";

std::string defaultFile() {
    std::error_code error;
    const fs::path self = fs::read_symlink("/proc/self/exe", error);
    if (!error) {
        for (const char* const library : kLibraries) {
            const fs::path beside = self.parent_path().parent_path() / "lib" / library;
            if (fs::exists(beside, error)) return beside.string();
        }
    }
    return kLibraries[1];
}

/// The loader searches its own path for a name without a slash; this makes it a file here.
std::string asPath(const std::string& file) {
    return file.find('/') == std::string::npos ? "./" + file : file;
}

std::string loaderMessage() {
    const char* message = ::dlerror();
    return message == nullptr ? "unknown error" : message;
}

}  // namespace

Plugin::Plugin(const std::optional<std::string>& file)
    : file_(file ? asPath(*file) : defaultFile()) {
    if (file && file->empty()) throw StartError("the name of the plug-in is empty");
    void* const library = ::dlopen(file_.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (library == nullptr) throw StartError("plug-in cannot be loaded: " + loaderMessage());
    void* const symbol = ::dlsym(library, kStartFunction);
    if (symbol == nullptr) {
        throw StartError("plug-in " + file_ + " has no function " + kStartFunction);
    }
    start_ = reinterpret_cast<int (*)()>(symbol);
}

}  // namespace host
