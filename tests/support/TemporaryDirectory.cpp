#include "support/TemporaryDirectory.h"

#include <cstdlib>
#include <fstream>
#include <stdexcept>

namespace {

void put(const std::string& path, std::string_view content, std::ios::openmode mode) {
    std::ofstream stream(path, mode | std::ios::binary);
    stream.write(content.data(), static_cast<std::streamsize>(content.size()));
    stream.close();
    if (!stream) {
        throw std::runtime_error("cannot write " + path);
    }
}

} // namespace

TemporaryDirectory::TemporaryDirectory() {
    std::string pattern = std::filesystem::temp_directory_path() / "zrm-test-XXXXXX";
    if (mkdtemp(pattern.data()) == nullptr) {
        throw std::runtime_error("cannot make a temporary directory");
    }
    m_path = pattern;
}

TemporaryDirectory::~TemporaryDirectory() {
    std::error_code ignored;
    std::filesystem::remove_all(m_path, ignored);
}

std::string TemporaryDirectory::write(std::string_view name, std::string_view content) const {
    put(file(name), content, std::ios::trunc);
    return file(name);
}

void TemporaryDirectory::append(std::string_view name, std::string_view content) const {
    put(file(name), content, std::ios::app);
}
