# The platform stand-in's log service, linked without the tests' log capture.
add_executable(test_platform_log ${CMAKE_CURRENT_SOURCE_DIR}/platform_log/platform_log_test.cpp)
target_link_libraries(test_platform_log PRIVATE stbplat_platform GTest::gtest_main)
add_test(NAME platform.log_default_levels COMMAND test_platform_log)
set_tests_properties(platform.log_default_levels PROPERTIES ENVIRONMENT
  "EXPECTED_LEVELS=0=2,2=2,3=2,11=2,18=2,31=2;STBPLAT_LOG_LEVEL=")
add_test(NAME platform.log_single_level COMMAND test_platform_log)
set_tests_properties(platform.log_single_level PROPERTIES ENVIRONMENT
  "EXPECTED_LEVELS=0=5,2=5,3=5,11=5,18=5,31=5;STBPLAT_LOG_LEVEL=5")
add_test(NAME platform.log_module_pairs COMMAND test_platform_log)
set_tests_properties(platform.log_module_pairs PROPERTIES ENVIRONMENT
  "EXPECTED_LEVELS=0=2,2=6,3=4,11=2,18=2,31=2;STBPLAT_LOG_LEVEL=2=6,3=4")
