#ifndef ZRM_TESTS_FAULTY_DISK_H
#define ZRM_TESTS_FAULTY_DISK_H

/// While it lives, files that SQLite opens are on a disk whose calls fail on demand. SQLite calls
/// the C library from a shared library of its own, where the other faults do not reach it.
class FaultyDisk {
public:
    FaultyDisk();
    ~FaultyDisk();
    FaultyDisk(const FaultyDisk&) = delete;
    FaultyDisk& operator=(const FaultyDisk&) = delete;

    /// From now on every write fails with this code of SQLite's; 0: none does.
    void failWrites(int code);
    /// From now on every read fails with this code of SQLite's; 0: none does.
    void failReads(int code);
    /// Number of calls that failed.
    int failed() const;
};

#endif
