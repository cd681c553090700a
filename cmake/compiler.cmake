set(CMAKE_CXX_STANDARD 20)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_EXPORT_COMPILE_COMMANDS ON)
set(CMAKE_POSITION_INDEPENDENT_CODE ON)
find_package(Threads REQUIRED)

find_program(CCACHE_PROGRAM ccache)
if(CCACHE_PROGRAM)
  set(CMAKE_CXX_COMPILER_LAUNCHER ${CCACHE_PROGRAM})
endif()

# The flags of every target of the project.
add_library(zrm_flags INTERFACE)
target_compile_options(zrm_flags INTERFACE -Wall -Wextra -Wpedantic -Wconversion -Werror)
target_link_libraries(zrm_flags INTERFACE Threads::Threads)
if(CMAKE_CXX_COMPILER_ID STREQUAL GNU)
  # GCC 12 sees overlapping copies inside std::string that cannot happen.
  target_compile_options(zrm_flags INTERFACE -Wno-restrict)
endif()

# Hardening. The build types that run somewhere are compiled with it; the one that is tested is not,
# because the checked calls of the C library would go round those that tests make fail. The package's
# tests look for it in the programs.
if(NOT ZRM_SANITIZE)
  include(CheckPIESupported)
  check_pie_supported()
  add_link_options(-Wl,-z,relro -Wl,-z,now)
  set(hardened "$<NOT:$<CONFIG:Debug>>")
  set(optimised "$<CONFIG:Release,RelWithDebInfo,MinSizeRel>")
  add_compile_options(
    "$<${hardened}:-fstack-protector-strong;-fstack-clash-protection;-Wformat;-Werror=format-security>"
    "$<${optimised}:-U_FORTIFY_SOURCE;-D_FORTIFY_SOURCE=2>")
  add_compile_definitions("$<${hardened}:_GLIBCXX_ASSERTIONS>")
  if(CMAKE_SYSTEM_PROCESSOR MATCHES "x86_64|AMD64")
    add_compile_options("$<${hardened}:-fcf-protection>")
  endif()
endif()

if(ZRM_SANITIZE)
  add_compile_options(-fsanitize=${ZRM_SANITIZE} -fno-omit-frame-pointer)
  add_link_options(-fsanitize=${ZRM_SANITIZE})
  # With the checks in the code, GCC takes the library's own objects for uninitialised.
  if(CMAKE_CXX_COMPILER_ID STREQUAL GNU)
    add_compile_options(-Wno-maybe-uninitialized)
  endif()
  # GCC warns of fences, which ThreadSanitizer does not see. Asio's stand beside locks, which it does.
  if(ZRM_SANITIZE MATCHES thread AND CMAKE_CXX_COMPILER_ID STREQUAL GNU)
    add_compile_options(-Wno-tsan)
  endif()
  if(ZRM_SANITIZE MATCHES undefined)
    add_compile_options(-fno-sanitize-recover=undefined)
  endif()
endif()

if(ZRM_FUZZ)
  add_compile_options(-fsanitize=fuzzer-no-link)
endif()

# A line's way leads through small functions of many files of src/ and of the contract's
# implementation. What an operator runs has them compiled as one, which makes a line a tenth cheaper.
if(CMAKE_BUILD_TYPE STREQUAL Release)
  include(CheckIPOSupported)
  check_ipo_supported(RESULT ZRM_COMPILE_AS_ONE OUTPUT ZRM_COMPILE_AS_ONE_ERROR LANGUAGES CXX)
  if(NOT ZRM_COMPILE_AS_ONE)
    message(WARNING "This compiler cannot optimise at link time, so lines will cost a tenth more: "
                    "${ZRM_COMPILE_AS_ONE_ERROR}")
  endif()
endif()
