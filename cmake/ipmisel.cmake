# What every target of the project is built with. Flags belong to targets: ipmisel_flags carries them.
find_program(IPMISEL_CCACHE ccache)
if(IPMISEL_CCACHE AND NOT CMAKE_CXX_COMPILER_LAUNCHER)
  # Precompiled headers hold times and macros: without this the cache passes by every file that uses them.
  set(CMAKE_CXX_COMPILER_LAUNCHER
      ${CMAKE_COMMAND} -E env CCACHE_SLOPPINESS=pch_defines,time_macros,include_file_mtime,include_file_ctime
      ${IPMISEL_CCACHE})
endif()

add_library(ipmisel_flags INTERFACE)
target_include_directories(ipmisel_flags INTERFACE ${PROJECT_SOURCE_DIR} ${PROJECT_SOURCE_DIR}/include)
target_compile_options(ipmisel_flags INTERFACE -Wall -Wextra -Wpedantic -Wshadow -Wformat=2 -Werror
                       # Lets ccache see precompiled headers.
                       $<$<CXX_COMPILER_ID:GNU>:-fpch-preprocess>)
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND CMAKE_CXX_COMPILER_VERSION VERSION_LESS 13)
  # At -O3 these compilers take a text put before a std::string for one that overlaps it; with
  # precompiled headers they do so at -O2, and see it pass its end. The packages are built without.
  target_compile_options(ipmisel_flags INTERFACE -Wno-restrict)
  if(NOT CMAKE_DISABLE_PRECOMPILE_HEADERS)
    target_compile_options(ipmisel_flags INTERFACE -Wno-array-bounds -Wno-stringop-overflow -Wno-stringop-overread)
  endif()
endif()
if(IPMISEL_LAN)
  target_compile_definitions(ipmisel_flags INTERFACE IPMISEL_LAN)
endif()
if(IPMISEL_M32)
  target_compile_options(ipmisel_flags INTERFACE -m32)
  target_link_options(ipmisel_flags INTERFACE -m32)
endif()
if(IPMISEL_SANITIZE)
  target_compile_options(ipmisel_flags INTERFACE -fsanitize=address,undefined
                         -fno-sanitize-recover=all -fno-omit-frame-pointer)
  target_link_options(ipmisel_flags INTERFACE -fsanitize=address,undefined)
endif()
if(IPMISEL_FUZZ)
  target_compile_options(ipmisel_flags INTERFACE -fsanitize=fuzzer-no-link,address,undefined
                         -fno-sanitize-recover=all -fno-omit-frame-pointer)
  target_link_options(ipmisel_flags INTERFACE -fsanitize=address,undefined)
endif()

# What nearly every source includes is compiled once. A source names all that it uses nevertheless:
# tools/tidy, and a build with CMAKE_DISABLE_PRECOMPILE_HEADERS, do without.
set(IPMISEL_STANDARD_HEADERS <algorithm> <array> <chrono> <cstdint> <cstdio> <cstring> <functional> <map>
                             <memory> <optional> <set> <span> <stdexcept> <string> <string_view> <utility>
                             <vector>)

# ipmisel_headers(NAME HEADER...): headers compiled once, for the parts that name it.
function(ipmisel_headers name)
  file(CONFIGURE OUTPUT ${PROJECT_BINARY_DIR}/${name}.cpp CONTENT "")
  add_library(${name} OBJECT ${PROJECT_BINARY_DIR}/${name}.cpp)
  target_link_libraries(${name} PRIVATE ipmisel_flags)
  # As the parts have it, else the compiled headers do not fit.
  set_target_properties(${name} PROPERTIES CXX_VISIBILITY_PRESET hidden VISIBILITY_INLINES_HIDDEN ON)
  target_precompile_headers(${name} PRIVATE ${ARGN})
endfunction()
ipmisel_headers(ipmisel_standard_headers ${IPMISEL_STANDARD_HEADERS})

# ipmisel_part(NAME [PRECOMPILED HEADERS] source...): a static part of a plug-in, a library or the program.
# Nothing of it is exported.
function(ipmisel_part name)
  cmake_parse_arguments(PARSE_ARGV 1 ARG "" PRECOMPILED "")
  if(NOT ARG_PRECOMPILED)
    set(ARG_PRECOMPILED ipmisel_standard_headers)
  endif()
  add_library(${name} STATIC ${ARG_UNPARSED_ARGUMENTS})
  target_link_libraries(${name} PUBLIC ipmisel_flags)
  set_target_properties(${name} PROPERTIES CXX_VISIBILITY_PRESET hidden
                        VISIBILITY_INLINES_HIDDEN ON)
  target_precompile_headers(${name} REUSE_FROM ${ARG_PRECOMPILED})
endfunction()

# ipmisel_add_plugin(NAME PART KEPT SYMBOL...)
# lib/ipmisel/libNAME.pi, target NAME_plugin: registration.cpp over PART, which does the work. It exports what
# libNAME.map lists; KEPT are those that nothing in the library uses.
function(ipmisel_add_plugin name part)
  cmake_parse_arguments(ARG "" "" "KEPT" ${ARGN})
  list(TRANSFORM ARG_KEPT PREPEND LINKER:--undefined=)
  set(exports ${CMAKE_CURRENT_SOURCE_DIR}/lib${name}.map)
  add_library(${name}_plugin SHARED registration.cpp)
  target_link_libraries(${name}_plugin PRIVATE ${part})
  target_link_options(${name}_plugin PRIVATE "LINKER:--version-script=${exports}" ${ARG_KEPT})
  set_target_properties(${name}_plugin PROPERTIES
                        OUTPUT_NAME ${name}
                        PREFIX lib
                        SUFFIX .pi
                        LIBRARY_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/lib/ipmisel
                        BUILD_WITH_INSTALL_RPATH ON
                        INSTALL_RPATH "\$ORIGIN"
                        CXX_VISIBILITY_PRESET hidden
                        VISIBILITY_INLINES_HIDDEN ON
                        LINK_DEPENDS ${exports})
endfunction()

# The configuration that is measured and installed is not the one whose tests anybody debugs or times:
# there they are compiled for a short build. The presets for a debugger keep their flags.
set(IPMISEL_TEST_FLAGS $<$<CONFIG:RelWithDebInfo>:-O0> $<$<CONFIG:RelWithDebInfo>:-g0>)

# ipmisel_test_target(TARGET): how every target of test code is compiled. The headers that nearly every
# test includes are compiled once, in ipmisel_test_headers.
function(ipmisel_test_target name)
  target_compile_options(${name} PRIVATE ${IPMISEL_TEST_FLAGS})
  # One setting for all of them, else the compiled headers do not fit.
  set_target_properties(${name} PROPERTIES POSITION_INDEPENDENT_CODE OFF)
  target_link_libraries(${name} PRIVATE ipmisel_flags ipmisel_gtest)
  if(NOT name STREQUAL ipmisel_test_headers)
    target_precompile_headers(${name} REUSE_FROM ipmisel_test_headers)
  endif()
endfunction()

# ipmisel_test(NAME [SLOW] SOURCES ... LIBRARIES ...): one GoogleTest program, one ctest entry. A slow one
# has the label "slow" and is left out of the target `quick`.
function(ipmisel_test name)
  cmake_parse_arguments(ARG SLOW "" "SOURCES;LIBRARIES" ${ARGN})
  add_executable(${name} ${ARG_SOURCES})
  target_link_libraries(${name} PRIVATE ${ARG_LIBRARIES})
  ipmisel_test_target(${name})
  set_target_properties(${name} PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/tests)
  add_test(NAME ${name} COMMAND ${name})
  if(ARG_SLOW)
    set_tests_properties(${name} PROPERTIES LABELS slow)
  else()
    add_dependencies(quick ${name})
  endif()
endfunction()
