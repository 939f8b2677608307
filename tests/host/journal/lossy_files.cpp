#include "host/journal/lossy_files.h"

#include <sqlite3.h>

#include <algorithm>
#include <cstring>
#include <map>
#include <memory>
#include <mutex>
#include <string>

namespace {

/// What a file holds, written or not. All connections of the process share it.
struct Content {
    std::mutex lock;
    std::string bytes;
};

/// SQLite's own layer takes no more at once.
constexpr std::size_t kPiece = 64 * 1024;

std::mutex contentsLock;
std::map<std::string, std::shared_ptr<Content>> contents;

sqlite3_vfs* real() {
    static sqlite3_vfs* const found = sqlite3_vfs_find("unix");
    return found;
}

/// SQLite sets aside this much and the real layer's size behind it.
struct LossyFile {
    sqlite3_file base;
    std::shared_ptr<Content>* content;
    sqlite3_file* behind() { return reinterpret_cast<sqlite3_file*>(this + 1); }
};

LossyFile& lossy(sqlite3_file* file) {
    return *reinterpret_cast<LossyFile*>(file);
}
sqlite3_file* behind(sqlite3_file* file) {
    return lossy(file).behind();
}

int closeFile(sqlite3_file* file) {
    const std::unique_ptr<std::shared_ptr<Content>> content(lossy(file).content);
    return behind(file)->pMethods->xClose(behind(file));
}

int readFile(sqlite3_file* file, void* to, int count, sqlite3_int64 offset) {
    Content& content = **lossy(file).content;
    const std::lock_guard<std::mutex> lock(content.lock);
    const auto at = std::min(static_cast<std::size_t>(offset), content.bytes.size());
    const auto wanted = static_cast<std::size_t>(count);
    const std::size_t there = std::min(wanted, content.bytes.size() - at);
    std::memcpy(to, content.bytes.data() + at, there);
    if (there == wanted) return SQLITE_OK;
    std::memset(static_cast<char*>(to) + there, 0, wanted - there);
    return SQLITE_IOERR_SHORT_READ;
}

int writeFile(sqlite3_file* file, const void* from, int count, sqlite3_int64 offset) {
    Content& content = **lossy(file).content;
    const std::lock_guard<std::mutex> lock(content.lock);
    const auto at = static_cast<std::size_t>(offset);
    const auto length = static_cast<std::size_t>(count);
    if (content.bytes.size() < at + length) content.bytes.resize(at + length);
    std::memcpy(content.bytes.data() + at, from, length);
    return SQLITE_OK;
}

int truncateFile(sqlite3_file* file, sqlite3_int64 size) {
    Content& content = **lossy(file).content;
    const std::lock_guard<std::mutex> lock(content.lock);
    content.bytes.resize(static_cast<std::size_t>(size));
    return SQLITE_OK;
}

int syncFile(sqlite3_file* file, int flags) {
    Content& content = **lossy(file).content;
    const std::lock_guard<std::mutex> lock(content.lock);
    sqlite3_file* const to = behind(file);
    int result = to->pMethods->xTruncate(to, static_cast<sqlite3_int64>(content.bytes.size()));
    for (std::size_t at = 0; result == SQLITE_OK && at < content.bytes.size(); at += kPiece) {
        const std::size_t length = std::min(kPiece, content.bytes.size() - at);
        result = to->pMethods->xWrite(to, content.bytes.data() + at, static_cast<int>(length),
                                      static_cast<sqlite3_int64>(at));
    }
    return result != SQLITE_OK ? result : to->pMethods->xSync(to, flags);
}

int sizeOfFile(sqlite3_file* file, sqlite3_int64* size) {
    Content& content = **lossy(file).content;
    const std::lock_guard<std::mutex> lock(content.lock);
    *size = static_cast<sqlite3_int64>(content.bytes.size());
    return SQLITE_OK;
}

// Locks and the memory that connections share are not on the disk.
int lockFile(sqlite3_file* file, int level) {
    return behind(file)->pMethods->xLock(behind(file), level);
}
int unlockFile(sqlite3_file* file, int level) {
    return behind(file)->pMethods->xUnlock(behind(file), level);
}
int checkLock(sqlite3_file* file, int* reserved) {
    return behind(file)->pMethods->xCheckReservedLock(behind(file), reserved);
}
/// Hints about the size would reach the real file.
int control(sqlite3_file* file, int what, void* value) {
    if (what == SQLITE_FCNTL_SIZE_HINT || what == SQLITE_FCNTL_CHUNK_SIZE) return SQLITE_OK;
    return behind(file)->pMethods->xFileControl(behind(file), what, value);
}
int sectorSize(sqlite3_file* file) {
    return behind(file)->pMethods->xSectorSize(behind(file));
}
int characteristics(sqlite3_file*) {
    return 0;
}
int mapShared(sqlite3_file* file, int page, int size, int extend, void volatile** to) {
    return behind(file)->pMethods->xShmMap(behind(file), page, size, extend, to);
}
int lockShared(sqlite3_file* file, int offset, int count, int flags) {
    return behind(file)->pMethods->xShmLock(behind(file), offset, count, flags);
}
void barrier(sqlite3_file* file) {
    behind(file)->pMethods->xShmBarrier(behind(file));
}
int unmapShared(sqlite3_file* file, int remove) {
    return behind(file)->pMethods->xShmUnmap(behind(file), remove);
}

const sqlite3_io_methods kMethods = {
    2,          closeFile,  readFile,    writeFile, truncateFile, syncFile,        sizeOfFile,
    lockFile,   unlockFile, checkLock,   control,   sectorSize,   characteristics, mapShared,
    lockShared, barrier,    unmapShared, nullptr,   nullptr};

std::shared_ptr<Content> contentOf(const char* name, sqlite3_file* file) {
    const std::lock_guard<std::mutex> lock(contentsLock);
    std::shared_ptr<Content>& content = contents[name == nullptr ? "" : name];
    if (content && name != nullptr) return content;
    content = std::make_shared<Content>();
    sqlite3_int64 size = 0;
    file->pMethods->xFileSize(file, &size);
    content->bytes.resize(static_cast<std::size_t>(size));
    for (std::size_t at = 0; at < content->bytes.size(); at += kPiece) {
        const std::size_t length = std::min(kPiece, content->bytes.size() - at);
        file->pMethods->xRead(file, content->bytes.data() + at, static_cast<int>(length),
                              static_cast<sqlite3_int64>(at));
    }
    return content;
}

int openFile(sqlite3_vfs*, const char* name, sqlite3_file* file, int flags, int* outFlags) {
    file->pMethods = nullptr;
    const int result = real()->xOpen(real(), name, behind(file), flags, outFlags);
    if (result != SQLITE_OK) return result;
    lossy(file).content = new std::shared_ptr<Content>(contentOf(name, behind(file)));
    file->pMethods = &kMethods;
    return SQLITE_OK;
}

int deleteFile(sqlite3_vfs*, const char* name, int sync) {
    {
        const std::lock_guard<std::mutex> lock(contentsLock);
        contents.erase(name);
    }
    return real()->xDelete(real(), name, sync);
}

}  // namespace

void writeOnlyWhatIsSynced() {
    static sqlite3_vfs layer = *real();
    layer.zName = "lossy";
    layer.szOsFile = static_cast<int>(sizeof(LossyFile)) + real()->szOsFile;
    layer.xOpen = openFile;
    layer.xDelete = deleteFile;
    sqlite3_vfs_register(&layer, 1);
}
