// What fsi1.h promises: directory listings.

#include "platform/fsi1.h"

#include <fcntl.h>
#include <sys/stat.h>
#include <unistd.h>

#include <algorithm>
#include <cerrno>
#include <fstream>
#include <map>
#include <string>

#include "conformance/rule.h"

namespace conformance {
namespace {

using Entries = std::map<std::string, FSI1_ENTRY>;

void makeFile(const std::string& path) {
    require(std::ofstream(path).good(), "cannot write " + path);
}

void makeDirectory(const std::string& path) {
    require(::mkdir(path.c_str(), 0755) == 0, "cannot make " + path);
}

void makeLink(const std::string& target, const std::string& path) {
    require(::symlink(target.c_str(), path.c_str()) == 0, "cannot make " + path);
}

FSI1_LIST* open(const std::string& directory) {
    FSI1_LIST* list = nullptr;
    requireEqual(FSI1_NewList(directory.c_str(), &list), int{FSI1_OK}, "the result of opening");
    return list;
}

/// A whole listing by path; it must end as listings end.
Entries entriesOf(const std::string& directory) {
    Entries found;
    FSI1_LIST* const list = open(directory);
    FSI1_ENTRY entry{};
    int result = FSI1_FetchList(list, &entry);
    for (; result == FSI1_OK; result = FSI1_FetchList(list, &entry)) {
        require(found.count(entry.path) == 0, std::string("listed twice: ") + entry.path);
        found[entry.path] = entry;
    }
    requireEqual(result, int{FSI1_END_OF_LIST}, "the result after the last entry");
    requireEqual(FSI1_FetchList(list, &entry), int{FSI1_END_OF_LIST}, "the result after that");
    requireEqual(FSI1_DeleteList(list), int{FSI1_OK}, "the result of closing");
    return found;
}

const FSI1_ENTRY& entry(const Entries& entries, const std::string& path) {
    const auto found = entries.find(path);
    require(found != entries.end(), "not listed: " + path);
    return found->second;
}

void saysWhyItCannotOpen(Bench& bench) {
    const std::string file = bench.scratch() + "/file";
    makeFile(file);
    FSI1_LIST* list = reinterpret_cast<FSI1_LIST*>(&bench);
    requireEqual(FSI1_NewList((bench.scratch() + "/none").c_str(), &list), ENOENT, "the result");
    require(list == nullptr, "left the handle as it was");
    requireEqual(FSI1_NewList("", &list), ENOENT, "the result for an empty name");
    requireEqual(FSI1_NewList(file.c_str(), &list), ENOTDIR, "the result for a file");
}

void refusesNoName(Bench&) {
    FSI1_LIST* list = nullptr;
    requireEqual(FSI1_NewList(nullptr, &list), EINVAL, "the result");
    require(list == nullptr, "gave a handle all the same");
}

void endsAnEmptyListing(Bench& bench) {
    require(entriesOf(bench.scratch()).empty(), "found entries in an empty directory");
}

void givesPathTimeAndKind(Bench& bench) {
    const std::string file = bench.scratch() + "/a.log";
    makeFile(file);
    const timespec times[2] = {{1000000000, 0}, {1000000000, 0}};
    require(::utimensat(AT_FDCWD, file.c_str(), times, 0) == 0, "utimensat failed");
    makeDirectory(bench.scratch() + "/sub");
    makeFile(bench.scratch() + "/sub/inner");
    const Entries found = entriesOf(bench.scratch());
    requireEqual(found.size(), std::size_t{2}, "the number of entries");
    requireEqual(entry(found, file).isDirectory, false, "a file's kind");
    requireEqual(entry(found, file).timeStamp, std::int64_t{1000000000}, "a file's time");
    requireEqual(entry(found, bench.scratch() + "/sub").isDirectory, true, "a directory's kind");
}

void listsHiddenFiles(Bench& bench) {
    makeFile(bench.scratch() + "/.hidden");
    makeFile(bench.scratch() + "/..twodots");
    requireEqual(entriesOf(bench.scratch()).size(), std::size_t{2}, "the number of entries");
}

void doesNotDoubleASlash(Bench& bench) {
    makeFile(bench.scratch() + "/a");
    entry(entriesOf(bench.scratch() + "/"), bench.scratch() + "/a");
}

void followsLinks(Bench& bench) {
    makeDirectory(bench.scratch() + "/sub");
    makeLink("sub", bench.scratch() + "/good");
    makeLink("nowhere", bench.scratch() + "/dangling");
    makeLink("circle", bench.scratch() + "/circle");
    const Entries found = entriesOf(bench.scratch());
    requireEqual(found.size(), std::size_t{4}, "the number of entries");
    requireEqual(entry(found, bench.scratch() + "/good").isDirectory, true, "a good link's kind");
    requireEqual(entry(found, bench.scratch() + "/dangling").isDirectory, false,
                 "a dangling link's kind");
    requireEqual(entry(found, bench.scratch() + "/circle").isDirectory, false, "a circle's kind");
}

void listsEveryFileOnce(Bench& bench) {
    for (int i = 0; i < 2000; ++i)
        makeFile(bench.scratch() + "/f" + std::to_string(i));
    requireEqual(entriesOf(bench.scratch()).size(), std::size_t{2000}, "the number of entries");
}

void leavesOutWhatVanishes(Bench& bench) {
    const std::string path = bench.scratch() + "/gone";
    makeFile(path);
    FSI1_LIST* const list = open(bench.scratch());
    require(::unlink(path.c_str()) == 0, "unlink failed");
    FSI1_ENTRY found{};
    requireEqual(FSI1_FetchList(list, &found), int{FSI1_END_OF_LIST}, "the result");
    FSI1_DeleteList(list);
}

/// A directory whose own path is 3996 bytes long, which leaves room for a "/", 98 more bytes and
/// the terminator.
std::string makeDeepDirectory(const std::string& below) {
    constexpr std::size_t kLength = 3996;
    std::string deep = below;
    while (deep.size() < kLength) {
        deep += "/" + std::string(std::min<std::size_t>(200, kLength - deep.size() - 1), 'd');
        makeDirectory(deep);
    }
    return deep;
}

void leavesOutWhatDoesNotFit(Bench& bench) {
    const std::string deep = makeDeepDirectory(bench.scratch());
    // Longer paths than the system takes are made by way of the directory's descriptor.
    const int directory = ::open(deep.c_str(), O_RDONLY | O_DIRECTORY | O_CLOEXEC);
    require(directory != -1, "cannot open the directory");
    for (const std::size_t length : {std::size_t{98}, std::size_t{99}, std::size_t{255}}) {
        const std::string name(length, 'f');
        const int made = ::openat(directory, name.c_str(), O_CREAT | O_WRONLY | O_CLOEXEC, 0644);
        require(made != -1, "cannot make a file with a long name");
        ::close(made);
    }
    ::close(directory);
    const Entries found = entriesOf(deep);
    requireEqual(found.size(), std::size_t{1}, "the number of entries");
    requireEqual(found.begin()->first.size(), std::size_t{4095}, "the length of its path");
}

void refusesNoHandle(Bench&) {
    FSI1_ENTRY found{};
    requireEqual(FSI1_FetchList(nullptr, &found), EINVAL, "the result");
}

void refusesToCloseNoHandle(Bench&) {
    requireEqual(FSI1_DeleteList(nullptr), EINVAL, "the result");
}

int lowestFreeDescriptor() {
    const int descriptor = ::dup(STDIN_FILENO);
    ::close(descriptor);
    return descriptor;
}

void leavesNoDescriptorBehind(Bench& bench) {
    const int before = lowestFreeDescriptor();
    for (int i = 0; i < 100; ++i)
        entriesOf(bench.scratch());
    requireEqual(lowestFreeDescriptor(), before, "the lowest free descriptor");
}

}  // namespace

std::vector<Operation> fsi1Operations() {
    return {
        {"FSI1_NewList",
         {{"says why a directory cannot be opened", saysWhyItCannotOpen},
          {"refuses a null name", refusesNoName}}},
        {"FSI1_FetchList",
         {{"ends an empty listing", endsAnEmptyListing},
          {"gives path, time and kind", givesPathTimeAndKind},
          {"lists hidden files", listsHiddenFiles},
          {"puts one slash before a name", doesNotDoubleASlash},
          {"follows links that lead anywhere", followsLinks},
          {"lists every file of a large directory once", listsEveryFileOnce},
          {"leaves out what vanishes meanwhile", leavesOutWhatVanishes},
          {"leaves out paths that do not fit", leavesOutWhatDoesNotFit},
          {"refuses a null handle", refusesNoHandle}}},
        {"FSI1_DeleteList",
         {{"refuses a null handle", refusesToCloseNoHandle},
          {"leaves no descriptor behind", leavesNoDescriptorBehind}}},
    };
}

}  // namespace conformance
