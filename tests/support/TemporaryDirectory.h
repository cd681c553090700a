#ifndef ZRM_TESTS_TEMPORARY_DIRECTORY_H
#define ZRM_TESTS_TEMPORARY_DIRECTORY_H

#include <filesystem>
#include <string>
#include <string_view>

/// A directory that is removed with everything in it.
class TemporaryDirectory {
public:
    TemporaryDirectory();
    ~TemporaryDirectory();
    TemporaryDirectory(const TemporaryDirectory&) = delete;
    TemporaryDirectory& operator=(const TemporaryDirectory&) = delete;

    std::filesystem::path path() const { return m_path; }
    /// The path of a file of this name in the directory.
    std::string file(std::string_view name) const { return m_path / name; }
    /// Writes a file afresh and returns its path.
    std::string write(std::string_view name, std::string_view content) const;
    /// Appends to a file, in one write.
    void append(std::string_view name, std::string_view content) const;

private:
    std::filesystem::path m_path;
};

#endif
