# Functions that declare the project's targets.

# A tree with tests links a hundred programs, and mold takes a tenth of the time of binutils' linker.
if(QUAZOR_TESTS)
  find_program(QUAZOR_MOLD mold)
  if(QUAZOR_MOLD)
    add_link_options(-fuse-ld=mold)
  endif()
endif()

set(QUAZOR_WARNINGS -Wall -Wextra -Wpedantic -Wconversion -Wshadow -Wnon-virtual-dtor)

# What makes an error in memory harder to exploit, in every build: checks of the stack, marked targets of indirect branches
# where the processor's family has them, and tables of the linker that are complete and read-only before the program begins.
# Nothing forces the processor's own check of branches: the start files of many distributions lack the marks.
include(CheckCXXCompilerFlag)
set(QUAZOR_HARDENING "")
foreach(flag -fstack-protector-strong -fcf-protection)
  string(MAKE_C_IDENTIFIER QUAZOR_HAS${flag} variable)
  check_cxx_compiler_flag(${flag} ${variable})
  if(${variable})
    list(APPEND QUAZOR_HARDENING ${flag})
  endif()
endforeach()
set(QUAZOR_HARDENING_OF_LINKS -Wl,-z,relro -Wl,-z,now)

# Sets the compiler options of the project's targets. They are PRIVATE and do not affect other targets.
function(quazor_configure target)
  target_compile_features(${target} PUBLIC cxx_std_20)
  target_compile_options(${target} PRIVATE ${QUAZOR_WARNINGS})
  if(QUAZOR_WERROR)
    target_compile_options(${target} PRIVATE -Werror)
  endif()
  target_compile_options(${target} PRIVATE ${QUAZOR_HARDENING})
  target_link_options(${target} PRIVATE ${QUAZOR_HARDENING_OF_LINKS})
  # The C library's checks of buffers need optimised code; sanitizers have their own, and a distribution may want more.
  if(NOT QUAZOR_SANITIZE AND NOT CMAKE_CXX_FLAGS MATCHES "_FORTIFY_SOURCE=")
    target_compile_options(${target} PRIVATE "$<$<NOT:$<CONFIG:Debug>>:SHELL:-U_FORTIFY_SOURCE -D_FORTIFY_SOURCE=2>")
  endif()
  set_target_properties(${target} PROPERTIES CXX_EXTENSIONS OFF CXX_VISIBILITY_PRESET hidden
                        VISIBILITY_INLINES_HIDDEN ON POSITION_INDEPENDENT_CODE ON)
  set_target_properties(${target} PROPERTIES UNITY_BUILD ${QUAZOR_UNITY} UNITY_BUILD_BATCH_SIZE 8)
  if(CMAKE_CXX_COMPILER_ID STREQUAL GNU)
    # By default g++ runs its garbage collector from 30 MB on, which takes an eighth of the compile time. Allow 512 MB.
    target_compile_options(${target} PRIVATE "SHELL:--param ggc-min-expand=300"
                           "SHELL:--param ggc-min-heapsize=524288")
  endif()
  if(QUAZOR_SANITIZE)
    target_compile_options(${target} PRIVATE -fsanitize=${QUAZOR_SANITIZE} -fno-sanitize-recover=all
                           -fno-omit-frame-pointer)
    # clang's check of vtable pointers opens a pipe, and reports every object as invalid if a test has used up all
    # descriptors.
    if(CMAKE_CXX_COMPILER_ID MATCHES Clang)
      target_compile_options(${target} PRIVATE -fno-sanitize=vptr)
    endif()
    target_link_options(${target} PRIVATE -fsanitize=${QUAZOR_SANITIZE})
    # Compilers disagree on how code may ask.
    foreach(sanitizer address thread)
      if(QUAZOR_SANITIZE MATCHES ${sanitizer})
        string(TOUPPER ${sanitizer} word)
        target_compile_definitions(${target} PRIVATE QUAZOR_${word}_SANITIZER)
      endif()
    endforeach()
  endif()
  if(QUAZOR_COVERAGE)
    quazor_is_counted(isCounted)
    if(isCounted)
      # Several threads update the counters.
      target_compile_options(${target} PRIVATE --coverage -fprofile-update=atomic)
    endif()
    target_link_options(${target} PRIVATE --coverage)
  endif()
endfunction()

# quazor_is_counted(RESULT): whether the lines of this folder that run are counted. Only what tests/coverage judges, because
# counting slows the tests down.
function(quazor_is_counted result)
  file(RELATIVE_PATH folder ${PROJECT_SOURCE_DIR} ${CMAKE_CURRENT_SOURCE_DIR})
  if(QUAZOR_COVERAGE AND folder MATCHES "^(contract|platform|diagnostics|plugins)")
    set(${result} TRUE PARENT_SCOPE)
  else()
    set(${result} FALSE PARENT_SCOPE)
  endif()
endfunction()

# Parsing the most common headers takes a third of a build, so they are precompiled: the first target of a kind owns the
# result and the others reuse it. Not in a build for fuzzers only, where libraries and plug-ins have different options.
function(quazor_precompile target kind)
  if(NOT QUAZOR_UNITY OR (QUAZOR_FUZZERS AND NOT QUAZOR_TESTS))
    return()
  endif()
  quazor_is_counted(isCounted)
  if(isCounted AND kind STREQUAL test)
    set(kind counted_test)  # compiled with other options
  endif()
  get_property(owner GLOBAL PROPERTY QUAZOR_HEADERS_OWNER_${kind})
  if(owner)
    target_precompile_headers(${target} REUSE_FROM ${owner})
  else()
    target_precompile_headers(${target} PRIVATE ${ARGN})
    set_property(GLOBAL PROPERTY QUAZOR_HEADERS_OWNER_${kind} ${target})
  endif()
endfunction()

# The optimisation of what only has to be compiled quickly in a debug build. g++ compiles with -Og as fast as without any,
# because it emits a third of the code, and the tests then take half the processor's time.
set(QUAZOR_QUICK -O0)
if(CMAKE_CXX_COMPILER_ID STREQUAL GNU)
  set(QUAZOR_QUICK -Og)
endif()

set(QUAZOR_COMMON_HEADERS <algorithm> <chrono> <cstdint> <filesystem> <functional> <map> <memory> <mutex> <optional>
                          <sstream> <string> <string_view> <unordered_map> <utility> <variant> <vector>)

# quazor_library(NAME SOURCES ... DEPENDS ...): a static library of one folder, linked as quazor::NAME.
function(quazor_library name)
  cmake_parse_arguments(ARG "" "" "SOURCES;DEPENDS" ${ARGN})
  add_library(quazor_${name} STATIC ${ARG_SOURCES})
  add_library(quazor::${name} ALIAS quazor_${name})
  target_include_directories(quazor_${name} PUBLIC ${PROJECT_SOURCE_DIR})
  target_link_libraries(quazor_${name} PUBLIC ${ARG_DEPENDS})
  quazor_configure(quazor_${name})
  # A fuzzer finds its way by what has run. Beside tests, it only has to start: counting takes a quarter of a compilation.
  if(QUAZOR_FUZZERS AND NOT QUAZOR_TESTS)
    target_compile_options(quazor_${name} PRIVATE -fsanitize=fuzzer-no-link)
  endif()
  file(RELATIVE_PATH folder ${PROJECT_SOURCE_DIR} ${CMAKE_CURRENT_SOURCE_DIR})
  # The host, tests and what reads or writes JSON wait for hardware and disks: optimising them fully takes a third of the
  # build's time, and nobody feels it.
  if(folder MATCHES "^(host|tests)" OR "nlohmann_json::nlohmann_json" IN_LIST ARG_DEPENDS)
    quazor_precompile(quazor_${name} json ${QUAZOR_COMMON_HEADERS} <nlohmann/json.hpp>)
    target_compile_options(quazor_${name} PRIVATE $<$<CONFIG:Release>:-O1> $<$<CONFIG:Debug>:${QUAZOR_QUICK}>)
  else()
    quazor_precompile(quazor_${name} plain ${QUAZOR_COMMON_HEADERS})
  endif()
  if(folder MATCHES "^(tests|host/testing)")
    quazor_compile_quickly(quazor_${name})
  endif()
endfunction()

# quazor_plugin(NAME SOURCES ... DEPENDS ...): a loadable plug-in NAME.so in the directory that the host searches.
function(quazor_plugin name)
  cmake_parse_arguments(ARG "" "" "SOURCES;DEPENDS" ${ARGN})
  add_library(${name} MODULE ${ARG_SOURCES})
  target_include_directories(${name} PRIVATE ${PROJECT_SOURCE_DIR})
  target_link_libraries(${name} PRIVATE ${ARG_DEPENDS})
  quazor_configure(${name})
  # Makes undefined symbols linker errors: a plug-in must link everything that it uses.
  target_link_options(${name} PRIVATE -Wl,--no-undefined -Wl,--exclude-libs,ALL)
  if(QUAZOR_SANITIZE AND CMAKE_CXX_COMPILER_ID MATCHES Clang)
    target_link_options(${name} PRIVATE -Wl,-z,undefs)  # clang resolves the sanitizer's runtime in the program
  endif()
  set_target_properties(${name} PROPERTIES PREFIX "" INSTALL_RPATH "$ORIGIN/.." DEFINE_SYMBOL ""
                        LIBRARY_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/${QUAZOR_PLUGIN_DIRECTORY})
  file(RELATIVE_PATH folder ${PROJECT_SOURCE_DIR} ${CMAKE_CURRENT_SOURCE_DIR})
  if(folder MATCHES "^tests")
    quazor_compile_quickly(${name})
    quazor_precompile(${name} json)
  else()
    quazor_precompile(${name} plain)
  endif()
endfunction()

# For tests and what only they use: what is seldom run is compiled quickly.
function(quazor_compile_quickly target)
  quazor_is_counted(isCounted)
  if(isCounted)
    target_compile_options(${target} PRIVATE -O0)  # optimised lines would be missing
  else()
    target_compile_options(${target} PRIVATE $<$<CONFIG:Debug>:${QUAZOR_QUICK}>)
  endif()
  # Checks of undefined behaviour take a third of the time in which clang compiles tests, so only the product has them, and
  # tests that instantiate its templates.
  file(RELATIVE_PATH folder ${PROJECT_SOURCE_DIR} ${CMAKE_CURRENT_SOURCE_DIR})
  if(QUAZOR_SANITIZE MATCHES undefined AND NOT folder MATCHES "^(contract|platform|base)")
    target_compile_options(${target} PRIVATE -fno-sanitize=undefined)
  endif()
endfunction()

# quazor_test_program(NAME SOURCES ... DEPENDS ...): a program that tests run, in the directory `tests` of the build tree.
function(quazor_test_program name)
  cmake_parse_arguments(ARG "" "" "SOURCES;DEPENDS" ${ARGN})
  add_executable(${name} ${ARG_SOURCES})
  target_link_libraries(${name} PRIVATE ${ARG_DEPENDS})
  quazor_configure(${name})
  quazor_compile_quickly(${name})
  # The definitions of host/ would be part of headers that others reuse.
  file(RELATIVE_PATH folder ${PROJECT_SOURCE_DIR} ${CMAKE_CURRENT_SOURCE_DIR})
  if(NOT folder MATCHES "^host")
    quazor_precompile(${name} program ${QUAZOR_COMMON_HEADERS} <nlohmann/json.hpp>)
  endif()
  set_target_properties(${name} PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/tests)
endfunction()

# quazor_test(NAME SOURCES ... DEPENDS ...): a GoogleTest program and its CTest entry.
function(quazor_test name)
  if(NOT QUAZOR_TESTS)
    return()
  endif()
  cmake_parse_arguments(ARG "" "" "SOURCES;DEPENDS" ${ARGN})
  add_executable(${name} ${ARG_SOURCES})
  target_include_directories(${name} PRIVATE ${PROJECT_SOURCE_DIR})
  target_link_libraries(${name} PRIVATE ${ARG_DEPENDS} GTest::gmock GTest::gtest_main)
  quazor_configure(${name})
  quazor_compile_quickly(${name})
  if(QUAZOR_SANITIZE)
    target_compile_options(${name} PRIVATE -g0)  # a report names the test's function, and the product's lines
  endif()
  quazor_precompile(${name} test ${QUAZOR_COMMON_HEADERS} <gmock/gmock.h> <gtest/gtest.h> <nlohmann/json.hpp>)
  set_target_properties(${name} PROPERTIES RUNTIME_OUTPUT_DIRECTORY ${PROJECT_BINARY_DIR}/tests)
  add_test(NAME ${name} COMMAND ${name} --gtest_brief=1)
endfunction()
