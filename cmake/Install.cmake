# What `cmake --install` puts where.

include(CMakePackageConfigHelpers)

foreach(program IN ITEMS zelkord zelkorctl zelkor-sandbox)
  if(TARGET ${program})
    install(TARGETS ${program} RUNTIME DESTINATION "${CMAKE_INSTALL_BINDIR}")
  endif()
endforeach()

# A file that names places: they are filled at the installation, with the prefix that it is given.
function(zk_install_template template destination)
  cmake_path(GET template STEM LAST_ONLY name)
  install(CODE "
    cmake_path(ABSOLUTE_PATH CMAKE_INSTALL_PREFIX NORMALIZE)
    cmake_path(APPEND CMAKE_INSTALL_PREFIX \"${CMAKE_INSTALL_BINDIR}\" OUTPUT_VARIABLE CMAKE_INSTALL_FULL_BINDIR)
    cmake_path(APPEND CMAKE_INSTALL_PREFIX \"${CMAKE_INSTALL_LIBDIR}\" OUTPUT_VARIABLE CMAKE_INSTALL_FULL_LIBDIR)
    cmake_path(APPEND CMAKE_INSTALL_PREFIX \"${CMAKE_INSTALL_INCLUDEDIR}\" OUTPUT_VARIABLE CMAKE_INSTALL_FULL_INCLUDEDIR)
    set(PROJECT_VERSION \"${PROJECT_VERSION}\")
    configure_file(\"${template}\" \"${PROJECT_BINARY_DIR}/packaging/${name}\" @ONLY)
    file(INSTALL \"${PROJECT_BINARY_DIR}/packaging/${name}\" DESTINATION \"\${CMAKE_INSTALL_PREFIX}/${destination}\")")
endfunction()

# zk_install_files(<pattern below the repository> <destination>)
function(zk_install_files pattern destination)
  file(GLOB files CONFIGURE_DEPENDS "${PROJECT_SOURCE_DIR}/${pattern}")
  foreach(file IN LISTS files)
    if(file MATCHES "\\.in$")
      zk_install_template("${file}" "${destination}")
    else()
      install(FILES "${file}" DESTINATION "${destination}")
    endif()
  endforeach()
endfunction()

# Units and activation files are looked for under lib and share whatever CMAKE_INSTALL_LIBDIR is.
zk_install_files("packaging/systemd/*.service*" lib/systemd/user)
zk_install_files("packaging/systemd/*.socket*" lib/systemd/user)
zk_install_files("packaging/dbus/*.service*" share/dbus-1/services)
zk_install_files("corezelkor/dbus/*.xml" share/dbus-1/interfaces)
zk_install_files("corezelkor/proto/*.proto" share/corezelkor/proto)
zk_install_files("packaging/man/*.1*" "${CMAKE_INSTALL_MANDIR}/man1")
zk_install_files("packaging/man/*.5*" "${CMAKE_INSTALL_MANDIR}/man5")
zk_install_files("packaging/man/*.8*" "${CMAKE_INSTALL_MANDIR}/man8")
zk_install_files("packaging/completions/bash/*" share/bash-completion/completions)
zk_install_files("packaging/completions/zsh/*" share/zsh/site-functions)
zk_install_files("packaging/completions/fish/*" share/fish/vendor_completions.d)

# The client library for other programs: find_package(corezelkor 1.0), then link corezelkor::corezelkor; or pkg-config.
# With COMPONENTS static also corezelkor::zk_corezelkor, the archives, which need all that they link.
set(package "${CMAKE_INSTALL_LIBDIR}/cmake/corezelkor")
if(TARGET corezelkor)
  install(TARGETS corezelkor EXPORT corezelkor LIBRARY DESTINATION "${CMAKE_INSTALL_LIBDIR}")
  install(EXPORT corezelkor NAMESPACE corezelkor:: DESTINATION "${package}")
  install(TARGETS zk_corezelkor zk_halvane zk_base zk_proto EXPORT corezelkorStatic
    ARCHIVE DESTINATION "${CMAKE_INSTALL_LIBDIR}")
  install(EXPORT corezelkorStatic NAMESPACE corezelkor:: DESTINATION "${package}")
  write_basic_package_version_file("${PROJECT_BINARY_DIR}/corezelkorConfigVersion.cmake"
    VERSION ${PROJECT_VERSION} COMPATIBILITY SameMajorVersion)
  install(FILES "${PROJECT_SOURCE_DIR}/cmake/corezelkorConfig.cmake" "${PROJECT_BINARY_DIR}/corezelkorConfigVersion.cmake"
    DESTINATION "${package}")
  zk_install_template("${PROJECT_SOURCE_DIR}/packaging/corezelkor.pc.in" "${CMAKE_INSTALL_LIBDIR}/pkgconfig")
  # The library's own headers, and of the others what these include.
  install(DIRECTORY corezelkor DESTINATION "${CMAKE_INSTALL_INCLUDEDIR}/corezelkor"
    FILES_MATCHING PATTERN "*.h" PATTERN "*TestSupport.h" EXCLUDE PATTERN examples EXCLUDE
    PATTERN internal EXCLUDE PATTERN dbus EXCLUDE PATTERN proto EXCLUDE)
  install(FILES base/Data.h base/Error.h base/Export.h base/Json.h base/Mutex.h base/Namespace.h base/ThreadSafety.h
    base/Time.h DESTINATION "${CMAKE_INSTALL_INCLUDEDIR}/corezelkor/base")
endif()
install(FILES "${PROJECT_SOURCE_DIR}/LICENSE" DESTINATION "${CMAKE_INSTALL_DOCDIR}")
