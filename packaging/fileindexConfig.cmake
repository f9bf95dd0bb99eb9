# find_package(fileindex) gives fileindex::fileindex: libfileindex.so.6.0 with its headers. Its
# interface carries JsonCpp (every request and record is a Json::Value), found through pkg-config
# as the library itself finds it.
include(CMakeFindDependencyMacro)
find_dependency(PkgConfig)
if(NOT TARGET PkgConfig::JSONCPP)
  pkg_check_modules(JSONCPP QUIET IMPORTED_TARGET jsoncpp)
  if(NOT JSONCPP_FOUND)
    set(fileindex_FOUND FALSE)
    set(fileindex_NOT_FOUND_MESSAGE "fileindex needs JsonCpp, which pkg-config does not find (libjsoncpp-dev)")
    return()
  endif()
endif()
include(${CMAKE_CURRENT_LIST_DIR}/fileindexTargets.cmake)
