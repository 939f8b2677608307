#include "host/process/plugin_loader.h"

#include <dlfcn.h>
#include <link.h>
#include <unistd.h>

#include <cstddef>
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
/// The libraries of this interface begin their own names so and end them with its version.
constexpr const char* kOwnName = "libzavmgmt.so.";
constexpr const char* kPluginVersion = "1";

/// Everything that a plug-in exports.
constexpr const char* kExports[] = {kStartFunction,
                                    "Initialize_Tovrin_Home",
                                    "QVS_NCS_RegisterAgentInterface",
                                    "ZAV_TOVRINHOME",
                                    "commands",
                                    "depotDir",
                                    "initialized",
                                    "queue_mutex",
                                    "taskQueue",
                                    "worktodo",
                                    "zav_kagreqt_application",
                                    "zav_kagreqt_table",
                                    "zav_kagreqt_static_manager",
                                    "zav_kinagt_application",
                                    "zav_kinagt_table",
                                    "zav_kinagt_static_manager",
                                    "zav_kagdyst_application",
                                    "zav_kagdyst_table",
                                    "zav_kagdyst_static_manager"};

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
    library_ = ::dlopen(file_.c_str(), RTLD_NOW | RTLD_LOCAL);
    if (library_ == nullptr) throw StartError("plug-in cannot be loaded: " + loaderMessage());
    const std::string ownName = libraryName();
    const std::string prefix = kOwnName;
    if (ownName.rfind(prefix, 0) == 0 && ownName != prefix + kPluginVersion) {
        throw StartError("plug-in " + file_ + " is " + ownName + "; this host needs " + prefix +
                         kPluginVersion);
    }
    void* const symbol = ::dlsym(library_, kStartFunction);
    if (symbol == nullptr) {
        throw StartError("plug-in " + file_ + " has no function " + kStartFunction);
    }
    start_ = reinterpret_cast<int (*)()>(symbol);
}

std::string Plugin::libraryName() const {
    link_map* map = nullptr;
    if (::dlinfo(library_, RTLD_DI_LINKMAP, &map) != 0 || map == nullptr) return file_;
    const char* strings = nullptr;
    std::optional<std::size_t> name;
    for (const ElfW(Dyn)* entry = map->l_ld; entry->d_tag != DT_NULL; ++entry) {
        if (entry->d_tag == DT_STRTAB) strings = reinterpret_cast<const char*>(entry->d_un.d_ptr);
        if (entry->d_tag == DT_SONAME) name = entry->d_un.d_val;
    }
    if (strings == nullptr || !name) return fs::path(file_).filename().string();
    return strings + *name;
}

std::vector<std::string> Plugin::missingExports() const {
    std::vector<std::string> missing;
    for (const char* const name : kExports) {
        if (::dlsym(library_, name) == nullptr) missing.emplace_back(name);
    }
    return missing;
}

}  // namespace host
