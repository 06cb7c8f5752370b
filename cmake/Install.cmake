# What `cmake --install` puts where. A file ending in .in has its @VARIABLES@ filled first.

foreach(program IN ITEMS zelkord zelkorctl zelkor-sandbox)
  if(TARGET ${program})
    install(TARGETS ${program} RUNTIME DESTINATION "${CMAKE_INSTALL_BINDIR}")
  endif()
endforeach()

# zk_install_files(<pattern below the repository> <destination>)
function(zk_install_files pattern destination)
  file(GLOB files CONFIGURE_DEPENDS "${PROJECT_SOURCE_DIR}/${pattern}")
  foreach(file IN LISTS files)
    if(file MATCHES "\\.in$")
      cmake_path(GET file STEM LAST_ONLY name)
      configure_file("${file}" "${PROJECT_BINARY_DIR}/packaging/${name}" @ONLY)
      set(file "${PROJECT_BINARY_DIR}/packaging/${name}")
    endif()
    install(FILES "${file}" DESTINATION "${destination}")
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

# The client library for other programs: find_package(corezelkor), then link corezelkor::zk_corezelkor.
install(TARGETS zk_corezelkor zk_halvane zk_base zk_proto EXPORT corezelkor ARCHIVE DESTINATION "${CMAKE_INSTALL_LIBDIR}")
install(EXPORT corezelkor NAMESPACE corezelkor:: DESTINATION "${CMAKE_INSTALL_LIBDIR}/cmake/corezelkor")
install(FILES "${PROJECT_SOURCE_DIR}/cmake/corezelkorConfig.cmake"
  DESTINATION "${CMAKE_INSTALL_LIBDIR}/cmake/corezelkor")
install(DIRECTORY base halvane corezelkor "${PROJECT_BINARY_DIR}/generated/corezelkor"
  DESTINATION "${CMAKE_INSTALL_INCLUDEDIR}/corezelkor"
  FILES_MATCHING PATTERN "*.h" PATTERN "*TestSupport.h" EXCLUDE PATTERN examples EXCLUDE
  PATTERN internal EXCLUDE)
