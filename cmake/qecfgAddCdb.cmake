# qecfg_add_cdb(TARGET SOURCE source... [HEADER])
#
# Compiles each class definition source at build time into NAME.cdef in the
# current binary directory (NAME: the source's name without its extension),
# again whenever the source or the compiler changes. With HEADER, also writes
# NAME_cdb.h beside it: the C header of the CDB's class names, class ids,
# attribute and action ids (cdbdump --header). TARGET is an interface library
# that builds them all: linking it orders the build and puts the headers'
# directory on the include path.
#
# Run as a script (cmake -P) it writes one header: the step behind HEADER.
if(CMAKE_SCRIPT_MODE_FILE AND DEFINED QECFG_HEADER_OUTPUT)
  execute_process(COMMAND ${QECFG_CDBDUMP} --header ${QECFG_CDB} OUTPUT_FILE ${QECFG_HEADER_OUTPUT}
    RESULT_VARIABLE status)
  if(NOT status EQUAL 0)
    file(REMOVE ${QECFG_HEADER_OUTPUT})
    message(FATAL_ERROR "cdbdump --header ${QECFG_CDB} failed")
  endif()
  return()
endif()

set(_QECFG_ADD_CDB_SCRIPT ${CMAKE_CURRENT_LIST_FILE})

function(qecfg_add_cdb target)
  cmake_parse_arguments(PARSE_ARGV 1 ARG "HEADER" "" "SOURCE")
  if(NOT ARG_SOURCE)
    message(FATAL_ERROR "qecfg_add_cdb(${target}) needs SOURCE")
  endif()
  # The imported programs of the installed package, or the targets of this tree.
  set(qecfg qecfg::qecfg)
  set(cdbdump qecfg::cdbdump)
  if(NOT TARGET qecfg::qecfg)
    set(qecfg qecfg)
    set(cdbdump cdbdump)
  endif()
  set(outputs)
  foreach(src IN LISTS ARG_SOURCE)
    get_filename_component(path ${src} ABSOLUTE)
    get_filename_component(name ${src} NAME_WE)
    set(cdb ${CMAKE_CURRENT_BINARY_DIR}/${name}.cdef)
    add_custom_command(OUTPUT ${cdb}
      COMMAND ${qecfg} ${path} ${cdb}
      DEPENDS ${path} ${qecfg}
      COMMENT "Compiling ${src} into ${name}.cdef" VERBATIM)
    list(APPEND outputs ${cdb})
    if(ARG_HEADER)
      set(header ${CMAKE_CURRENT_BINARY_DIR}/${name}_cdb.h)
      add_custom_command(OUTPUT ${header}
        COMMAND ${CMAKE_COMMAND} -DQECFG_CDBDUMP=$<TARGET_FILE:${cdbdump}> -DQECFG_CDB=${cdb}
                -DQECFG_HEADER_OUTPUT=${header} -P ${_QECFG_ADD_CDB_SCRIPT}
        DEPENDS ${cdb} ${cdbdump}
        COMMENT "Writing the identifiers of ${name}.cdef into ${name}_cdb.h" VERBATIM)
      list(APPEND outputs ${header})
    endif()
  endforeach()
  add_library(${target} INTERFACE ${outputs})
  target_include_directories(${target} INTERFACE ${CMAKE_CURRENT_BINARY_DIR})
endfunction()
