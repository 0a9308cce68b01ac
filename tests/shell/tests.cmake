corvista_test(shell LIBRARIES agent_shell test_support SOURCES
  shell/both_ways.cpp
  shell/both_ways_test.cpp
  shell/filters_test.cpp
  shell/mounts_test.cpp)
target_compile_definitions(shell_test PRIVATE CORVISTA_TESTS_DIR="${CMAKE_CURRENT_LIST_DIR}/..")

corvista_test(shell_traps LIBRARIES agent_shell test_support LABELS threads SOURCES
  shell/both_ways.cpp
  shell/traps_test.cpp)
