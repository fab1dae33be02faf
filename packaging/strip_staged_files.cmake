# Run by CPack on the staged files, after CPACK_STRIP_FILES has stripped the
# programs: as Debian's own packaging does, the static libraries lose their
# debugging sections (nine tenths of their size), and libraries and programs
# the compiler's notes; archives get no time stamps.
file(GLOB_RECURSE libraries "${CPACK_TEMPORARY_INSTALL_DIRECTORY}/*.a")
file(GLOB programs "${CPACK_TEMPORARY_INSTALL_DIRECTORY}/bin/*" "${CPACK_TEMPORARY_INSTALL_DIRECTORY}/usr/bin/*")
foreach(file ${libraries} ${programs})
  execute_process(
    COMMAND strip --strip-debug --remove-section=.comment --remove-section=.note --enable-deterministic-archives
            ${file}
    COMMAND_ERROR_IS_FATAL ANY)
endforeach()
