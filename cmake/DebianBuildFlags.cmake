# Compiles and links with the flags Debian builds its packages with: dpkg-buildflags' optimisation,
# debugging information (which the packages move to their -dbgsym companions) and every hardening
# feature (stack protector, fortified functions, format checks, read-only relocations, immediate
# binding). Source paths are mapped to ".", so the binaries do not depend on where they were built.
find_program(DPKG_BUILDFLAGS dpkg-buildflags)
if(NOT DPKG_BUILDFLAGS)
  message(FATAL_ERROR "FILEINDEX_DEBIAN_BUILD_FLAGS needs dpkg-buildflags; install dpkg-dev")
endif()
foreach(_flags CFLAGS CXXFLAGS CPPFLAGS LDFLAGS)
  execute_process(COMMAND ${CMAKE_COMMAND} -E env DEB_BUILD_MAINT_OPTIONS=hardening=+all
                          ${DPKG_BUILDFLAGS} --get ${_flags}
                  WORKING_DIRECTORY ${PROJECT_SOURCE_DIR}
                  OUTPUT_VARIABLE _debian_${_flags} OUTPUT_STRIP_TRAILING_WHITESPACE COMMAND_ERROR_IS_FATAL ANY)
endforeach()
string(APPEND CMAKE_C_FLAGS " ${_debian_CFLAGS} ${_debian_CPPFLAGS}")
string(APPEND CMAKE_CXX_FLAGS " ${_debian_CXXFLAGS} ${_debian_CPPFLAGS}")
foreach(_kind EXE SHARED MODULE)
  string(APPEND CMAKE_${_kind}_LINKER_FLAGS " ${_debian_LDFLAGS}")
endforeach()
