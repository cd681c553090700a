# A folder of src/ or host/ is a layer. It is a static library of its own, zrm_NAME for src/NAME and
# zrm_host_NAME for host/NAME, and links only layers below it. Its headers lie behind a directory
# that has nothing but this folder, so that an include is found only where the layer is linked.
# tests/tools/layers.py reads the lists that follow BELOW.
#
#   zrm_layer(NAME BELOW layer... SOURCES file...)     without sources: headers alone
function(zrm_layer name)
  cmake_parse_arguments(PARSE_ARGV 1 layer "" "" "BELOW;SOURCES")
  file(RELATIVE_PATH folder ${PROJECT_SOURCE_DIR} ${CMAKE_CURRENT_SOURCE_DIR})
  string(REGEX REPLACE "^src/" "" include ${folder})
  set(headers ${PROJECT_BINARY_DIR}/layers/${folder})
  get_filename_component(parent ${headers}/${include} DIRECTORY)
  file(MAKE_DIRECTORY ${parent})
  file(CREATE_LINK ${CMAKE_CURRENT_SOURCE_DIR} ${headers}/${include} SYMBOLIC)
  if(layer_SOURCES)
    add_library(${name} STATIC ${layer_SOURCES})
    # The contract's implementation closes a circle of libraries, which a linker that reads them in
    # order has to go around a few times.
    set_target_properties(${name} PROPERTIES LINK_INTERFACE_MULTIPLICITY 4)
    if(ZRM_COVERAGE)
      target_compile_options(${name} PRIVATE -O0 --coverage -fprofile-update=atomic)
      target_link_options(${name} PUBLIC --coverage)
    endif()
    set(scope PUBLIC)
  else()
    add_library(${name} INTERFACE)
    set(scope INTERFACE)
  endif()
  target_include_directories(${name} ${scope} ${headers})
  target_link_libraries(${name} ${scope} zrm_flags ${layer_BELOW})
endfunction()
