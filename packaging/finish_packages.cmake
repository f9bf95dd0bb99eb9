# Run by cpack once it has written the packages (CPACK_POST_BUILD_SCRIPTS), for what its Debian
# generator leaves undone:
# - a package with an ldconfig trigger loses the postinst and postrm that cpack writes for every
#   shared library, which call ldconfig themselves;
# - a -dbgsym package gets md5sums of its own files (cpack's name the files where it staged them)
#   and, as Debian's do, its doc directory as a link to that of the package whose binaries it
#   belongs to, which it depends on.
# Each package changed is unpacked and built again with dpkg-deb.
list(GET CPACK_PACKAGE_FILES 0 _first)
get_filename_component(_directory ${_first} DIRECTORY)
file(GLOB _packages ${_directory}/*.deb ${_directory}/*.ddeb)

foreach(_package_file IN LISTS _packages)
  set(_tree ${_directory}/finishing)
  file(REMOVE_RECURSE ${_tree})
  execute_process(COMMAND dpkg-deb --raw-extract ${_package_file} ${_tree} COMMAND_ERROR_IS_FATAL ANY)
  file(STRINGS ${_tree}/DEBIAN/control _name REGEX "^Package: ")
  string(REPLACE "Package: " "" _name "${_name}")

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
  else()
    continue()
  endif()
  execute_process(COMMAND dpkg-deb --root-owner-group --build ${_tree} ${_package_file}
                  OUTPUT_QUIET COMMAND_ERROR_IS_FATAL ANY)
endforeach()
file(REMOVE_RECURSE ${_directory}/finishing)
