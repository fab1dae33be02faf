# Run by CPack on the staged files: the static libraries lose their debugging
# sections (a tenth of the size), as CPACK_STRIP_FILES does for the programs.
file(GLOB_RECURSE libraries "${CPACK_TEMPORARY_INSTALL_DIRECTORY}/*.a")
foreach(library ${libraries})
  execute_process(COMMAND strip --strip-debug ${library} COMMAND_ERROR_IS_FATAL ANY)
endforeach()
