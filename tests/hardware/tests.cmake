corvista_test(hardware LABELS threads SOURCES
  hardware/base_test.cpp
  hardware/host_test.cpp
  hardware/hosts_test.cpp
  hardware/memory_beside_dmidecode_test.cpp
  hardware/memory_test.cpp
  hardware/deadline_runner_test.cpp
  hardware/page_test.cpp
  hardware/processors_test.cpp
  hardware/recorded_beside_tools_test.cpp
  hardware/recorded_host.cpp
  hardware/sensors_beside_lm_sensors_test.cpp
  hardware/sensors_test.cpp
  hardware/system_test.cpp
  hardware/watcher_test.cpp
  LIBRARIES hardware_code)
target_compile_definitions(hardware_test PRIVATE CORVISTA_TESTS_DIR="${CMAKE_SOURCE_DIR}/tests"
  CORVISTA_AS_SYSFS="$<TARGET_FILE:as_sysfs>")
# What is preloaded into the system's own sensors is free of sanitizers, as that is.
add_library(as_sysfs SHARED hardware/as_sysfs.cpp)
target_link_libraries(as_sysfs PRIVATE corvista_options ${CMAKE_DL_LIBS})
target_compile_options(as_sysfs PRIVATE -fno-sanitize=all -fvisibility=default -U_FILE_OFFSET_BITS)  # statfs, not statfs64
target_link_options(as_sysfs PRIVATE -fno-sanitize=all -Wl,--as-needed)
add_dependencies(hardware_test as_sysfs)

# In a network of its own, whose links the tests make and take away.
corvista_test(hardware_links SOURCES
  hardware/links_test.cpp
  hardware/recorded_host.cpp
  hardware/this_host_test.cpp
  LIBRARIES hardware_code)

corvista_test(hardware_storage LABELS threads SOURCES
  hardware/links_this_host_test.cpp
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
