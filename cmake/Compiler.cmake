# Language level, warnings, sanitizers, and the tools that make builds quick.

set(CMAKE_CXX_STANDARD 20)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_EXPORT_COMPILE_COMMANDS ON)
set(CMAKE_UNITY_BUILD_BATCH_SIZE 12)

set(ZK_SANITIZE "" CACHE STRING "Sanitizers, as -fsanitize= takes them")
option(ZK_FUZZ "Make libFuzzer executables of the fuzz targets" OFF)

add_compile_options(
  -Wall -Wextra -Wpedantic -Wshadow -Wnon-virtual-dtor $<$<BOOL:${ZK_WERROR}>:-Werror>
  # A designated initializer that leaves out fields is how requests and test cases are written here.
  -Wno-missing-field-initializers)
if(CMAKE_CXX_COMPILER_ID STREQUAL "Clang")
  add_compile_options(
    -Wthread-safety
    # C++20 allows INSTANTIATE_TEST_SUITE_P without its last argument; clang 14 still warns.
    -Wno-gnu-zero-variadic-macro-arguments)
else()
  # Both misfire in g++ 12 on inlined std::string and std::optional code (GCC bugs 105651, 80635).
  add_compile_options(-Wno-restrict -Wno-maybe-uninitialized)
endif()

if(ZK_SANITIZE)
  add_compile_options(-fsanitize=${ZK_SANITIZE} -fno-sanitize-recover=all -fno-omit-frame-pointer)
  add_link_options(-fsanitize=${ZK_SANITIZE})
endif()
if(ZK_FUZZ)
  add_compile_options(-fsanitize=fuzzer-no-link)
  add_link_options(-fsanitize=fuzzer-no-link)
endif()

find_program(ZK_CCACHE ccache)
if(ZK_CCACHE)
  set(CMAKE_CXX_COMPILER_LAUNCHER "${ZK_CCACHE}")
endif()
find_program(ZK_LLD ld.lld)
if(ZK_LLD)
  add_link_options(-fuse-ld=lld)
endif()
