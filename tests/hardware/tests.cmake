corvista_test(hardware LABELS threads SOURCES
  hardware/base_test.cpp
  hardware/host_test.cpp
  hardware/hosts_test.cpp
  hardware/memory_test.cpp
  hardware/patience_test.cpp
  hardware/processors_test.cpp
  hardware/recorded_host.cpp
  hardware/sensors_test.cpp
  hardware/system_test.cpp
  hardware/watcher_test.cpp
  LIBRARIES hardware_code)
target_compile_definitions(hardware_test PRIVATE CORVISTA_TESTS_DIR="${CMAKE_SOURCE_DIR}/tests")

# In a network of its own, whose links the tests make and take away.
corvista_test(hardware_links SOURCES
  hardware/links_test.cpp
  hardware/recorded_host.cpp
  hardware/this_host_test.cpp
  LIBRARIES hardware_code)

corvista_test(hardware_storage LABELS threads SOURCES
  hardware/recorded_host.cpp
  hardware/storage_file_systems_test.cpp
  hardware/storage_health_test.cpp
  hardware/storage_hostile_test.cpp
  hardware/storage_this_host_test.cpp
  LIBRARIES hardware_code)
