# The shared library's exports are exactly the checked-in interface, and it
# takes from the platform library only what the platform's list holds.
set(STBPLAT_IMPORT_CHECK_MODE "")
if(CMAKE_CXX_FLAGS MATCHES "-fsanitize=[^ ]*undefined")
  set(STBPLAT_IMPORT_CHECK_MODE sanitized)
endif()
add_test(NAME abi.exported_symbols
  COMMAND ${PROJECT_SOURCE_DIR}/scripts/check-exports.sh $<TARGET_FILE:stbplat>
          ${PROJECT_SOURCE_DIR}/tests/abi/exports ${CMAKE_NM}
          $<TARGET_FILE:stbplat_platform> ${PROJECT_SOURCE_DIR}/tests/abi/platform-imports.txt
          ${STBPLAT_IMPORT_CHECK_MODE})
add_test(NAME abi.os_seam_discipline
  COMMAND ${PROJECT_SOURCE_DIR}/scripts/check-seam.sh ${PROJECT_SOURCE_DIR})
