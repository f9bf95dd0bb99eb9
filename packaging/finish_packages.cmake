# Run by cpack once it has written the packages (CPACK_POST_BUILD_SCRIPTS), for what its Debian
# generator leaves undone:
# - a package with an ldconfig trigger loses the postinst and postrm that cpack writes for every
#   shared library, which call ldconfig themselves;
# - a -dbgsym package gets md5sums of its own files (cpack's name the files where it staged them)
#   and, as Debian's do, its doc directory as a link to that of the package whose binaries it
#   belongs to, which it depends on;
# - every package's Installed-Size is that of its files as shipped: cpack measures them before it
#   moves the debugging information out.
# Each package is unpacked and built again with dpkg-deb.
cmake_minimum_required(VERSION 3.22)
list(GET CPACK_PACKAGE_FILES 0 _first)
get_filename_component(_directory ${_first} DIRECTORY)
file(GLOB _packages ${_directory}/*.deb ${_directory}/*.ddeb)
set(_tree ${_directory}/finishing)

foreach(_package_file IN LISTS _packages)
  file(REMOVE_RECURSE ${_tree})
  execute_process(COMMAND dpkg-deb --raw-extract ${_package_file} ${_tree} COMMAND_ERROR_IS_FATAL ANY)
  file(READ ${_tree}/DEBIAN/control _control)
  string(REGEX MATCH "(^|\n)Package: ([^\n]*)" _ ${_control})
  set(_name ${CMAKE_MATCH_2})

  if(EXISTS ${_tree}/DEBIAN/triggers)
    file(REMOVE ${_tree}/DEBIAN/postinst ${_tree}/DEBIAN/postrm)
  elseif(_name MATCHES "^(.*)-dbgsym$")
    file(MAKE_DIRECTORY ${_tree}/usr/share/doc)
    file(CREATE_LINK ${CMAKE_MATCH_1} ${_tree}/usr/share/doc/${_name} SYMBOLIC)
    file(GLOB_RECURSE _files LIST_DIRECTORIES false RELATIVE ${_tree} ${_tree}/usr/lib/*)
    list(SORT _files)
    set(_sums "")
    foreach(_file IN LISTS _files)
      file(MD5 ${_tree}/${_file} _sum)
      string(APPEND _sums "${_sum}  ${_file}\n")
    endforeach()
    file(WRITE ${_tree}/DEBIAN/md5sums "${_sums}")
  endif()

  # As dpkg-gencontrol counts: each file's size in KiB rounded up, and 1 for every other entry.
  file(GLOB_RECURSE _entries LIST_DIRECTORIES true ${_tree}/*)
  list(FILTER _entries EXCLUDE REGEX "^${_tree}/DEBIAN(/|$)")
  set(_size 0)
  foreach(_entry IN LISTS _entries)
    if(IS_SYMLINK ${_entry} OR IS_DIRECTORY ${_entry})
      math(EXPR _size "${_size} + 1")
    else()
      file(SIZE ${_entry} _bytes)
      math(EXPR _size "${_size} + (${_bytes} + 1023) / 1024")
    endif()
  endforeach()
  string(REGEX REPLACE "Installed-Size: [0-9]+" "Installed-Size: ${_size}" _control "${_control}")
  file(WRITE ${_tree}/DEBIAN/control "${_control}")

  execute_process(COMMAND dpkg-deb --root-owner-group --build ${_tree} ${_package_file}
                  OUTPUT_QUIET COMMAND_ERROR_IS_FATAL ANY)
endforeach()
file(REMOVE_RECURSE ${_tree})
