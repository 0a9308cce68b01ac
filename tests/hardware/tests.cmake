corvista_test(hardware SOURCES
  hardware/golden.cpp
  hardware/golden_test.cpp
  hardware/storage_file_systems_test.cpp
  hardware/storage_health_test.cpp
  hardware/storage_hostile_test.cpp
  LIBRARIES hardware_code test_support LABELS threads)
target_compile_definitions(hardware_test PRIVATE CORVISTA_TESTS_DIR="${CMAKE_SOURCE_DIR}/tests")
