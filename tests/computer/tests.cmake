corvista_test(computer LIBRARIES plugin_code test_support SOURCES
  computer/agent_test.cpp
  computer/calendar_test.cpp
  computer/clock_file_test.cpp
  computer/commands_test.cpp
  computer/computer_node_test.cpp
  computer/computer_start_test.cpp
  computer/failing_calls.cpp
  computer/host_name_test.cpp
  computer/hosts_file_test.cpp
  computer/local_time_test.cpp
  computer/owner_data_test.cpp
  computer/system_data_test.cpp
  computer/zone_table_test.cpp
  support/failing_new.cpp)
target_compile_definitions(computer_test PRIVATE
  CVAGENT_PROGRAM="$<TARGET_FILE:cvagent_whole>" CORVISTA_PLUGIN="$<TARGET_FILE:vantrelcvicoshwmi>")
add_dependencies(computer_test cvagent vantrelcvicoshwmi)
