# The library `stbplat run` preloads: it exports exactly the library's
# interface (a call it lacked would reach the real device), and a program
# built against libstbplat.so rewrites a record of a copy of the example
# device through it, in every build (the device build under its emulator).
if(TARGET stbplat_run_preload)
  add_test(NAME abi.run_preload_exports
    COMMAND ${PROJECT_SOURCE_DIR}/scripts/check-exports.sh $<TARGET_FILE:stbplat_run_preload>
            ${PROJECT_SOURCE_DIR}/tests/abi/exports ${CMAKE_NM})
  add_test(NAME run.preload_rewrites_record
    COMMAND ${PROJECT_SOURCE_DIR}/scripts/check-run-preload.sh $<TARGET_FILE:stbplat_run_preload>
            $<TARGET_FILE:stbplat_rewrite_version> ${PROJECT_SOURCE_DIR}/examples/device
            ${CMAKE_CROSSCOMPILING_EMULATOR})
endif()
# Under AddressSanitizer both libraries register their globals, and the
# preload's second definition of each (what interposing it means) is reported
# as an ODR violation; that check stays on for every other test.
if(TARGET stbplat_run_preload AND CMAKE_CXX_FLAGS MATCHES "-fsanitize=[^ ]*address")
  set_tests_properties(run.preload_rewrites_record PROPERTIES ENVIRONMENT "ASAN_OPTIONS=detect_odr_violation=0")
endif()
