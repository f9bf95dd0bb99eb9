# Runs one interface program in a small appliance made afresh under ROOT, the root the library was
# built with: share "photo" at ROOT/volume1/photo in the emulated share database, and a folder list
# that indexes "/photo/holiday" for photos. The program gets ROOT as its only argument.
#
#   cmake -DROOT=<root> -DPROGRAM=<program> -P run_in_appliance.cmake
if(NOT ROOT MATCHES "^/." OR NOT PROGRAM)
  message(FATAL_ERROR "usage: cmake -DROOT=<absolute root> -DPROGRAM=<program> -P run_in_appliance.cmake")
endif()

file(REMOVE_RECURSE ${ROOT})
file(MAKE_DIRECTORY ${ROOT}/emulation ${ROOT}/tmp ${ROOT}/var/run ${ROOT}/usr/vexo/etc/fileindex
     ${ROOT}/volume1/photo/holiday)
file(WRITE ${ROOT}/emulation/shares.json "[{\"name\": \"photo\", \"path\": \"${ROOT}/volume1/photo\"}]")
file(WRITE ${ROOT}/usr/vexo/etc/fileindex/folder.conf
     "{\"/photo/holiday\": {\"name\": \"Holiday\", \"document\": false, \"audio\": false, \"video\": false, \"photo\": true}}")

execute_process(COMMAND ${PROGRAM} ${ROOT} RESULT_VARIABLE result)
if(NOT result EQUAL 0)
  message(FATAL_ERROR "${PROGRAM} failed (${result})")
endif()
