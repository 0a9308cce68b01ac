corvista_test(shell PARTS 2 LIBRARIES agent_shell test_support SOURCES
  shell/adapters_test.cpp
  shell/both_ways.cpp
  shell/both_ways_test.cpp
  shell/filters_test.cpp
  shell/mounts_test.cpp)
target_compile_definitions(shell_test PRIVATE CORVISTA_TESTS_DIR="${CMAKE_CURRENT_LIST_DIR}/.."
  HOSTTOOLS_PROGRAM="$<TARGET_FILE:corvista-hosttools>" HOSTTOOLS_LINKS="$<TARGET_FILE_DIR:corvista-hosttools>/adapters")
add_dependencies(shell_test corvista-hosttools)

corvista_test(shell_traps LIBRARIES agent_shell test_support LABELS threads SOURCES
  shell/both_ways.cpp
  shell/traps_test.cpp)
