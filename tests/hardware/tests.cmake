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
  hardware/neighbours_test.cpp
  hardware/recorded_host.cpp
  hardware/storage_file_systems_test.cpp
  hardware/storage_health_test.cpp
  hardware/storage_hostile_test.cpp
  hardware/storage_this_host_test.cpp
  hardware/storage_waiting_test.cpp
  LIBRARIES hardware_code)

# Found by the name of the library that it stands for, once a test has loaded it.
add_library(fake_lldpctl SHARED hardware/fake_lldpctl.cpp)
target_link_libraries(fake_lldpctl PRIVATE corvista_options)
set_target_properties(fake_lldpctl PROPERTIES OUTPUT_NAME lldpctl SOVERSION 4 UNITY_BUILD OFF
  LIBRARY_OUTPUT_DIRECTORY ${CMAKE_CURRENT_BINARY_DIR}/fake)
add_dependencies(hardware_storage_test fake_lldpctl)
target_compile_definitions(hardware_storage_test PRIVATE
  CORVISTA_FAKE_LLDPCTL="$<TARGET_SONAME_FILE:fake_lldpctl>")
