# Everything the build takes from the system, each part with the Debian 12 package it comes from.

# Like find_package, but a miss says what to install.
macro(zk_find package debianPackage)
  find_package(${package} QUIET ${ARGN})
  if(NOT ${package}_FOUND)
    message(FATAL_ERROR "${package} not found: install ${debianPackage}, or everything with ./dev setup")
  endif()
endmacro()

# The same for a pkg-config module; makes the target PkgConfig::<name>.
macro(zk_find_module name module debianPackage)
  pkg_check_modules(${name} QUIET IMPORTED_TARGET GLOBAL ${module})
  if(NOT ${name}_FOUND)
    message(FATAL_ERROR "${module} not found: install ${debianPackage}, or everything with ./dev setup")
  endif()
endmacro()

zk_find(Threads libc6-dev)
zk_find(PkgConfig pkg-config)
zk_find(ICU libicu-dev COMPONENTS uc i18n)
zk_find(Boost "libboost-json1.81-dev and libboost1.81-dev" 1.81 CONFIG COMPONENTS headers json)
zk_find(fmt libfmt-dev CONFIG)
zk_find(spdlog libspdlog-dev CONFIG)
zk_find(CLI11 libcli11-dev CONFIG)
zk_find(Protobuf "libprotobuf-dev and protobuf-compiler")
zk_find(CURL libcurl4-openssl-dev)
zk_find(SQLite3 libsqlite3-dev)
zk_find(OpenSSL libssl-dev)
zk_find(ZLIB zlib1g-dev)
if(ZK_BUILD_TESTS)
  zk_find(GTest libgmock-dev CONFIG)
endif()
if(ZK_BUILD_BENCHMARKS)
  zk_find(benchmark libbenchmark-dev CONFIG)
  zk_find(absl libabsl-dev CONFIG)
endif()
zk_find_module(systemd libsystemd libsystemd-dev)
zk_find_module(plist libplist-2.0 libplist-dev)

# CLD2 has neither a CMake package nor a pkg-config file.
find_library(ZK_CLD2_LIBRARY cld2)
find_path(ZK_CLD2_INCLUDE_DIR cld2/public/compact_lang_det.h)
if(NOT ZK_CLD2_LIBRARY OR NOT ZK_CLD2_INCLUDE_DIR)
  message(FATAL_ERROR "CLD2 not found: install libcld2-dev, or everything with ./dev setup")
endif()
add_library(CLD2::CLD2 UNKNOWN IMPORTED)
set_target_properties(CLD2::CLD2 PROPERTIES
  IMPORTED_LOCATION "${ZK_CLD2_LIBRARY}"
  INTERFACE_INCLUDE_DIRECTORIES "${ZK_CLD2_INCLUDE_DIR}")
