corvista_test(hardware SOURCES
  hardware/golden.cpp
  hardware/golden_test.cpp
  LIBRARIES hardware_code test_support LABELS threads)
target_compile_definitions(hardware_test PRIVATE CORVISTA_TESTS_DIR="${CMAKE_SOURCE_DIR}/tests")
