corvista_test(change_checks LIBRARIES agent_change agent_core test_support SOURCES
  change/change_file_test.cpp
  change/checks_test.cpp
  change/unified_diff_test.cpp)
corvista_test(change_apply PARTS 2 LIBRARIES agent_change agent_core test_support SOURCES
  change/apply_command_test.cpp
  change/in_force_test.cpp)
target_compile_definitions(change_apply_test PRIVATE ${agent_test_programs})
add_dependencies(change_apply_test cvagent corvista-hosttools fake_plugin vantrelcvicoshwmi)
