#include "support/FaultyDisk.h"

#include <atomic>

#include <sqlite3.h>

namespace {

std::atomic<int> writeCode{0};
std::atomic<int> readCode{0};
std::atomic<int> failures{0};
sqlite3_vfs* realDisk = nullptr;
sqlite3_vfs disk;

/// A file of this disk; the real one lies behind it in memory.
struct File {
    sqlite3_file base;
    sqlite3_file* real() { return reinterpret_cast<sqlite3_file*>(this + 1); }
};

sqlite3_file* real(sqlite3_file* file) {
    return reinterpret_cast<File*>(file)->real();
}

int fails(const std::atomic<int>& code) {
    const int now = code.load();
    failures += now == 0 ? 0 : 1;
    return now;
}

int doRead(sqlite3_file* file, void* to, int amount, sqlite3_int64 offset) {
    const int code = fails(readCode);
    return code != 0 ? code : real(file)->pMethods->xRead(real(file), to, amount, offset);
}

int doWrite(sqlite3_file* file, const void* from, int amount, sqlite3_int64 offset) {
    const int code = fails(writeCode);
    return code != 0 ? code : real(file)->pMethods->xWrite(real(file), from, amount, offset);
}

/// Hands a call over to the real file.
template <auto Member> struct Forward;
template <class... Arguments, int (*sqlite3_io_methods::*Member)(sqlite3_file*, Arguments...)>
struct Forward<Member> {
    static int call(sqlite3_file* file, Arguments... arguments) {
        return (real(file)->pMethods->*Member)(real(file), arguments...);
    }
};

void doBarrier(sqlite3_file* file) {
    real(file)->pMethods->xShmBarrier(real(file));
}

const sqlite3_io_methods methods = {
    2,
    Forward<&sqlite3_io_methods::xClose>::call,
    doRead,
    doWrite,
    Forward<&sqlite3_io_methods::xTruncate>::call,
    Forward<&sqlite3_io_methods::xSync>::call,
    Forward<&sqlite3_io_methods::xFileSize>::call,
    Forward<&sqlite3_io_methods::xLock>::call,
    Forward<&sqlite3_io_methods::xUnlock>::call,
    Forward<&sqlite3_io_methods::xCheckReservedLock>::call,
    Forward<&sqlite3_io_methods::xFileControl>::call,
    Forward<&sqlite3_io_methods::xSectorSize>::call,
    Forward<&sqlite3_io_methods::xDeviceCharacteristics>::call,
    Forward<&sqlite3_io_methods::xShmMap>::call,
    Forward<&sqlite3_io_methods::xShmLock>::call,
    doBarrier,
    Forward<&sqlite3_io_methods::xShmUnmap>::call,
    nullptr,
    nullptr,
};

int doOpen(sqlite3_vfs*, const char* name, sqlite3_file* file, int flags, int* given) {
    file->pMethods = nullptr;
    const int code = realDisk->xOpen(realDisk, name, real(file), flags, given);
    if (code == SQLITE_OK) {
        file->pMethods = &methods;
    }
    return code;
}

} // namespace

FaultyDisk::FaultyDisk() {
    realDisk = sqlite3_vfs_find(nullptr);
    disk = *realDisk;
    disk.zName = "faulty";
    disk.szOsFile = static_cast<int>(sizeof(File)) + realDisk->szOsFile;
    disk.xOpen = doOpen;
    disk.pNext = nullptr;
    failures = 0;
    sqlite3_vfs_register(&disk, 1);
}

FaultyDisk::~FaultyDisk() {
    failWrites(0);
    failReads(0);
    sqlite3_vfs_unregister(&disk);
    sqlite3_vfs_register(realDisk, 1);
}

void FaultyDisk::failWrites(int code) {
    writeCode = code;
}

void FaultyDisk::failReads(int code) {
    readCode = code;
}

int FaultyDisk::failed() const {
    return failures;
}
