# How a folder becomes targets. Files are found by their names, so that adding one needs no change here:
#
#   FooTest.cpp, FooTestSupport.cpp   the folder's one test executable
#   FooBenchmark.cpp                  belongs to no library
#   main.cpp                          the main file of an executable
#   examples/*.cpp                    programs of their own
#   any other *.cpp                   the folder's library
#
# Every function accepts a folder without such files.

# Sanitizer settings for every test. CMake escapes nothing in ENVIRONMENT: values hold no semicolons.
find_program(ZK_SYMBOLIZER NAMES llvm-symbolizer-14 llvm-symbolizer)
set(ZK_TEST_ENVIRONMENT
  "ASAN_OPTIONS=halt_on_error=1:detect_stack_use_after_return=1:external_symbolizer_path=${ZK_SYMBOLIZER}"
  "UBSAN_OPTIONS=halt_on_error=1:print_stacktrace=1:external_symbolizer_path=${ZK_SYMBOLIZER}"
  "TSAN_OPTIONS=halt_on_error=1:die_after_fork=0:second_deadlock_stack=1:suppressions=${PROJECT_SOURCE_DIR}/sanitizers/tsan.supp:external_symbolizer_path=${ZK_SYMBOLIZER}")

# Notes what a path links, for check_includes.py: zk_note_links(<path below the repository> <name> <deps> <test deps>)
function(zk_note_links path name deps test_deps)
  string(REPLACE ";" " " deps "${deps}")
  string(REPLACE ";" " " test_deps "${test_deps}")
  file(RELATIVE_PATH path "${PROJECT_SOURCE_DIR}" "${CMAKE_CURRENT_SOURCE_DIR}/${path}")
  set_property(GLOBAL APPEND_STRING PROPERTY ZK_LAYERS "${path}\t${name}\t${deps}\t${test_deps}\n")
endfunction()

# Notes the rooms of the current folder's library: zk_note_rooms(<library> <what it links> <rooms>)
function(zk_note_rooms library deps rooms)
  foreach(room IN LISTS rooms)
    string(REGEX MATCH "^([^:]+)(: *(.*))?$" matched "${room}")
    set(folder "${CMAKE_MATCH_1}")
    string(REPLACE " " ";" uses "${CMAKE_MATCH_3}")
    list(TRANSFORM uses PREPEND "${library}/")
    zk_note_links(${folder} ${library}/${folder} "${deps};${uses}" ${library}_tests)
  endforeach()
endfunction()

# zk_library(<name> [RECURSE] [PUBLISHED] [DEPS <target>...] [DEFINES <definition>...] [TEST_DEPS <target>...]
#            [ROOMS "<folder>: <folder>..."...])
#
# The current folder (with RECURSE: and those below) as a library, and its tests as <name>_tests.
# A PUBLISHED one can be linked into other programs and their plug-ins: its code is position-independent, and only what
# ZK_EXPORT marks is seen outside. DEPS are handed on to whoever links the library; DEFINES are seen in this folder only, also by its tests.
# ROOMS are the folders below, each with those that it may include from; only tests, and what stands in no room, may include from all.
function(zk_library name)
  cmake_parse_arguments(PARSE_ARGV 1 arg "RECURSE;PUBLISHED" "" "DEPS;DEFINES;TEST_DEPS;ROOMS")
  set(glob GLOB)
  if(arg_RECURSE)
    set(glob GLOB_RECURSE)
  endif()
  file(${glob} sources CONFIGURE_DEPENDS *.cpp)
  set(tests ${sources})
  list(FILTER sources EXCLUDE REGEX "(Test|TestSupport|Benchmark|/main|/examples/[^/]+)\\.cpp$")
  list(FILTER tests INCLUDE REGEX "(Test|TestSupport)\\.cpp$")

  if(sources)
    add_library(${name} STATIC ${sources})
    set(scope PUBLIC)
    target_compile_definitions(${name} PRIVATE ${arg_DEFINES})
    if(arg_PUBLISHED)
      zk_publish(${name})
    endif()
  else()
    add_library(${name} INTERFACE)
    set(scope INTERFACE)
  endif()
  target_include_directories(${name} ${scope}
    "$<BUILD_INTERFACE:${PROJECT_SOURCE_DIR}>" "$<INSTALL_INTERFACE:${CMAKE_INSTALL_INCLUDEDIR}/corezelkor>")
  target_link_libraries(${name} ${scope} ${arg_DEPS})

  list(TRANSFORM arg_ROOMS REPLACE "^([^:]+).*$" "${name}/\\1" OUTPUT_VARIABLE rooms)
  zk_note_links("" ${name} "${arg_DEPS};${rooms}" "${arg_TEST_DEPS}")
  zk_note_rooms(${name} "${arg_DEPS}" "${arg_ROOMS}")
  zk_tests(${name}_tests SOURCES ${tests} DEPS ${name} ${arg_TEST_DEPS} DEFINES ${arg_DEFINES})
endfunction()

function(zk_publish name)
  set_target_properties(${name} PROPERTIES
    POSITION_INDEPENDENT_CODE ON CXX_VISIBILITY_PRESET hidden VISIBILITY_INLINES_HIDDEN ON)
endfunction()

# zk_executable(<name> DEPS <target>...): the program whose main file is the current folder's main.cpp.
function(zk_executable name)
  cmake_parse_arguments(PARSE_ARGV 1 arg "" "" "DEPS")
  zk_note_links(main.cpp ${name} "${arg_DEPS}" "")
  file(GLOB main CONFIGURE_DEPENDS main.cpp)
  if(main)
    add_executable(${name} ${main})
    target_link_libraries(${name} PRIVATE ${arg_DEPS})
  endif()
endfunction()

# zk_tests(<name> SOURCES <file>... [DEPS <target>...] [DEFINES <definition>...] [TIMEOUT <seconds>])
#
# One GoogleTest executable, one entry in ctest.
function(zk_tests name)
  cmake_parse_arguments(PARSE_ARGV 1 arg "" "TIMEOUT" "SOURCES;DEPS;DEFINES")
  if(NOT arg_SOURCES OR NOT ZK_BUILD_TESTS)
    return()
  endif()
  if(NOT arg_TIMEOUT)
    set(arg_TIMEOUT 300)
  endif()
  add_executable(${name} ${arg_SOURCES})
  target_compile_definitions(${name} PRIVATE ${arg_DEFINES})
  target_link_libraries(${name} PRIVATE ${arg_DEPS} GTest::gmock_main)
  if(CMAKE_UNITY_BUILD AND CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
    # To it, each source of a unity build is a header, whose anonymous namespace others might not share.
    target_compile_options(${name} PRIVATE -Wno-subobject-linkage)
  endif()
  add_test(NAME ${name} COMMAND ${name})
  zk_test_properties(${name} ${arg_TIMEOUT})
endfunction()

function(zk_test_properties name timeout)
  set_tests_properties(${name} PROPERTIES TIMEOUT ${timeout} ENVIRONMENT "${ZK_TEST_ENVIRONMENT}")
endfunction()

# Gives a target that starts our programs their paths: ZK_ZELKORD_BINARY, ZK_ZELKORCTL_BINARY and
# ZK_ZELKOR_SANDBOX_BINARY, empty for a program that is not built.
function(zk_use_programs target)
  foreach(program IN ITEMS zelkord zelkorctl zelkor-sandbox)
    string(MAKE_C_IDENTIFIER ${program} macro)
    string(TOUPPER "ZK_${macro}_BINARY" macro)
    if(TARGET ${program})
      add_dependencies(${target} ${program})
      target_compile_definitions(${target} PRIVATE "${macro}=\"$<TARGET_FILE:${program}>\"")
    else()
      target_compile_definitions(${target} PRIVATE "${macro}=\"\"")
    endif()
  endforeach()
endfunction()

# zk_proto_library(<name> [WITHOUT_PRESENCE <field>...]): the current folder's *.proto, included as "<folder>/<File>.pb.h".
#
# WITHOUT_PRESENCE: optional fields whose generated `has_FIELD` would collide with a field of that name; the C++ class
# has them without presence. The messages on the wire are the same.
function(zk_proto_library name)
  cmake_parse_arguments(PARSE_ARGV 1 arg "" "" "WITHOUT_PRESENCE")
  list(JOIN arg_WITHOUT_PRESENCE "|" without_presence)
  zk_note_links("" ${name} "" "")
  file(GLOB protos CONFIGURE_DEPENDS *.proto)
  if(NOT protos)
    add_library(${name} INTERFACE)
    return()
  endif()
  set(out "${PROJECT_BINARY_DIR}/generated")
  set(copies "${PROJECT_BINARY_DIR}/protos")
  set(generated)
  foreach(proto IN LISTS protos)
    file(RELATIVE_PATH stem "${PROJECT_SOURCE_DIR}" "${proto}")
    string(REGEX REPLACE "\\.proto$" "" stem "${stem}")
    cmake_path(GET stem PARENT_PATH folder)
    file(MAKE_DIRECTORY "${out}" "${copies}/${folder}")
    add_custom_command(
      OUTPUT "${out}/${stem}.pb.cc" "${out}/${stem}.pb.h"
      COMMAND sed -E "s/optional ([a-z0-9]+ (${without_presence}) =)/\\1/" "${proto}" > "${copies}/${stem}.proto"
      COMMAND protobuf::protoc "--proto_path=${copies}" "--cpp_out=${out}" "${copies}/${stem}.proto"
      DEPENDS ${protos} protobuf::protoc
      COMMENT "protoc ${stem}.proto"
      VERBATIM)
    list(APPEND generated "${out}/${stem}.pb.cc" "${out}/${stem}.pb.h")
  endforeach()
  add_custom_target(${name}_generated DEPENDS ${generated})
  add_dependencies(generated ${name}_generated)

  add_library(${name} STATIC ${generated})
  add_dependencies(${name} ${name}_generated)
  # Generated code is not ours to mend: no warnings in it, nor in what includes its headers.
  target_compile_options(${name} PRIVATE -w)
  set_target_properties(${name} PROPERTIES UNITY_BUILD OFF)
  zk_publish(${name})
  target_include_directories(${name} SYSTEM PUBLIC "$<BUILD_INTERFACE:${out}>")
  target_link_libraries(${name} PUBLIC protobuf::libprotobuf)
endfunction()

# Everything that a reader of the sources (clang-tidy) needs generated first.
add_custom_target(generated)

# zk_fuzz_targets(DEPS <target>...): an executable of each FooFuzz.cpp in the current folder.
#
# With ZK_FUZZ libFuzzer drives it; otherwise it is a test that replays the files of corpus/Foo.
function(zk_fuzz_targets)
  cmake_parse_arguments(PARSE_ARGV 0 arg "" "" "DEPS")
  add_custom_target(fuzzers)
  file(GLOB sources CONFIGURE_DEPENDS *Fuzz.cpp)
  foreach(source IN LISTS sources)
    cmake_path(GET source STEM name)
    string(REGEX REPLACE "Fuzz$" "" subject "${name}")
    add_executable(${name} "${source}")
    add_dependencies(fuzzers ${name})
    target_link_libraries(${name} PRIVATE ${arg_DEPS})
    if(ZK_FUZZ)
      target_link_options(${name} PRIVATE -fsanitize=fuzzer)
    else()
      target_sources(${name} PRIVATE "${PROJECT_SOURCE_DIR}/cmake/FuzzReplayMain.cpp")
      set(corpus "${CMAKE_CURRENT_SOURCE_DIR}/corpus/${subject}")
      if(IS_DIRECTORY "${corpus}")
        add_test(NAME ${name} COMMAND ${name} "${corpus}")
        zk_test_properties(${name} 300)
      endif()
    endif()
  endforeach()
endfunction()
