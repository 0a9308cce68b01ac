corvista_test(framework LABELS threads SOURCES
  framework/data_directory_test.cpp
  framework/date_time_test.cpp
  framework/error_test.cpp
  framework/event_test.cpp
  framework/log_test.cpp
  framework/management_interface_test.cpp
  framework/netinfo_test.cpp
  framework/node_test.cpp
  framework/number_test.cpp
  framework/property_file_durability_test.cpp
  framework/property_file_test.cpp
  framework/property_value_test.cpp
  framework/slots_test.cpp
  framework/stress_test.cpp
  framework/strings_test.cpp
  framework/thread_test.cpp
  support/failing_new.cpp
  support/no_child_lists.cpp
  LIBRARIES test_support)
set_source_files_properties(framework/stress_test.cpp PROPERTIES SKIP_UNITY_BUILD_INCLUSION ON)
