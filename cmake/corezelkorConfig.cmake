# find_package(corezelkor 1.0): the client library as the shared corezelkor::corezelkor. COMPONENTS static: also the archives,
# as corezelkor::zk_corezelkor.

include(CMakeFindDependencyMacro)
find_dependency(Threads)
find_dependency(Boost 1.81 CONFIG COMPONENTS headers json)
include("${CMAKE_CURRENT_LIST_DIR}/corezelkor.cmake")

if("static" IN_LIST corezelkor_FIND_COMPONENTS)
  find_dependency(PkgConfig)
  find_dependency(ICU COMPONENTS uc i18n)
  find_dependency(fmt CONFIG)
  find_dependency(Protobuf)
  pkg_check_modules(systemd REQUIRED QUIET IMPORTED_TARGET GLOBAL libsystemd)
  include("${CMAKE_CURRENT_LIST_DIR}/corezelkorStatic.cmake")
  set(corezelkor_static_FOUND TRUE)
endif()
