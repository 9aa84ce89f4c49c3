# A program outside the tree builds against the installed package.
if(NOT CMAKE_CROSSCOMPILING AND NOT CMAKE_CXX_FLAGS MATCHES "sanitize")
  add_test(NAME install.consumer_builds
    COMMAND ${PROJECT_SOURCE_DIR}/scripts/check-install.sh ${PROJECT_BINARY_DIR} ${PROJECT_SOURCE_DIR})
endif()
