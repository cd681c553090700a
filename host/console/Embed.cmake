# Writes a C++ source with the contents of files:
# cmake -D "ENTRIES=NAME=PATH|..." -D OUTPUT=FILE -P Embed.cmake
string(REPLACE "|" ";" ENTRIES "${ENTRIES}")
set(arrays "")
set(table "")
set(index 0)
foreach(entry IN LISTS ENTRIES)
  string(REGEX MATCH "^([^=]+)=(.+)$" _ "${entry}")
  set(name ${CMAKE_MATCH_1})
  file(READ ${CMAKE_MATCH_2} content HEX)
  string(REGEX REPLACE "(................................................................)"
    "\\1\n" content "${content}")
  string(REGEX REPLACE "([0-9a-f][0-9a-f])" "0x\\1," content "${content}")
  string(APPEND arrays "constexpr unsigned char file${index}[] = {\n${content}\n};\n")
  string(APPEND table "    {\"${name}\", text(file${index}, sizeof file${index})},\n")
  math(EXPR index "${index} + 1")
endforeach()

file(WRITE ${OUTPUT} "#include \"host/console/ConsoleResource.h\"

#include <cstddef>

namespace zrm::host {

namespace {

${arrays}
std::string_view text(const unsigned char* bytes, std::size_t size) {
    return {reinterpret_cast<const char*>(bytes), size};
}

const ConsoleFile files[] = {
${table}};

} // namespace

const ConsoleFile* ConsoleFile::find(std::string_view name) {
    for (const ConsoleFile& file : files) {
        if (file.name == name) {
            return &file;
        }
    }
    return nullptr;
}

} // namespace zrm::host
")
