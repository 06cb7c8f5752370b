# find_package(corezelkor): the client library as the target corezelkor::zk_corezelkor.

include(CMakeFindDependencyMacro)
find_dependency(Threads)
find_dependency(PkgConfig)
find_dependency(ICU COMPONENTS uc i18n)
find_dependency(Boost 1.81 CONFIG COMPONENTS headers json)
find_dependency(fmt CONFIG)
find_dependency(Protobuf)
pkg_check_modules(systemd REQUIRED QUIET IMPORTED_TARGET GLOBAL libsystemd)

include("${CMAKE_CURRENT_LIST_DIR}/corezelkor.cmake")
