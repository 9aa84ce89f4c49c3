# GoogleTest for a cross build. The target's GoogleTest is not packaged, so it
# is built here from the distribution's source tree (Debian: googletest,
# /usr/src/googletest) with the cross compiler. Gives the same imported names
# as find_package(GTest): GTest::gtest, GTest::gtest_main, GTest::gmock,
# GTest::gmock_main.
set(STBPLAT_GTEST_SOURCE_DIR /usr/src/googletest CACHE PATH
    "GoogleTest source tree built for cross builds")
if(NOT EXISTS ${STBPLAT_GTEST_SOURCE_DIR}/CMakeLists.txt)
  message(FATAL_ERROR "GoogleTest sources not found in ${STBPLAT_GTEST_SOURCE_DIR} "
                      "(scripts/deps.sh cross installs them)")
endif()

set(INSTALL_GTEST OFF CACHE BOOL "" FORCE)
set(BUILD_GMOCK ON CACHE BOOL "" FORCE)
# Third-party code: built with its own flags, without the project's -Werror.
get_directory_property(stbplat_saved_options COMPILE_OPTIONS)
set_directory_properties(PROPERTIES COMPILE_OPTIONS "")
add_subdirectory(${STBPLAT_GTEST_SOURCE_DIR} ${CMAKE_BINARY_DIR}/third_party/googletest
                 EXCLUDE_FROM_ALL)
set_directory_properties(PROPERTIES COMPILE_OPTIONS "${stbplat_saved_options}")

# Its headers are system headers to our code, as the packaged ones are on the
# host, so our warning flags do not apply to them.
foreach(lib gtest gtest_main gmock gmock_main)
  get_target_property(dirs ${lib} INTERFACE_INCLUDE_DIRECTORIES)
  set_target_properties(${lib} PROPERTIES INTERFACE_SYSTEM_INCLUDE_DIRECTORIES "${dirs}")
endforeach()
