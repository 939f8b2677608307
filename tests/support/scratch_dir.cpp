#include "support/scratch_dir.h"

#include <sys/stat.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <iterator>
#include <stdexcept>

namespace fs = std::filesystem;

ScratchDir::ScratchDir() {
    std::string pattern = fs::temp_directory_path() / "zavtest.XXXXXX";
    if (::mkdtemp(pattern.data()) == nullptr) throw std::runtime_error("no scratch directory");
    root_ = pattern;
}

ScratchDir::~ScratchDir() {
    std::error_code ignored;
    fs::remove_all(root_, ignored);
}

std::string ScratchDir::path(const std::string& relative) const {
    return relative.empty() ? root_ : root_ + "/" + relative;
}

std::string ScratchDir::makeDir(const std::string& relative) const {
    fs::create_directories(path(relative));
    return path(relative);
}

std::string ScratchDir::write(const std::string& relative, const std::string& content,
                              mode_t mode) const {
    const std::string file = path(relative);
    fs::create_directories(fs::path(file).parent_path());
    std::ofstream(file, std::ios::binary | std::ios::trunc) << content;
    ::chmod(file.c_str(), mode);
    return file;
}

std::string ScratchDir::script(const std::string& relative, const std::string& body) const {
    return write(relative, "#!/bin/sh\n" + body, 0755);
}

std::string ScratchDir::read(const std::string& relative) const {
    std::ifstream in(path(relative), std::ios::binary);
    return {std::istreambuf_iterator<char>(in), std::istreambuf_iterator<char>()};
}

bool ScratchDir::exists(const std::string& relative) const {
    return fs::exists(path(relative));
}
