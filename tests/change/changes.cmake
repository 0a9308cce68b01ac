corvista_test(change_checks LIBRARIES agent_change agent_core test_support SOURCES
  change/change_file_test.cpp
  change/changes_page_test.cpp
  change/checks_test.cpp
  change/outcome_test.cpp
  change/unified_diff_test.cpp)
target_compile_definitions(change_checks_test PRIVATE CORVISTA_CHANGES_PAGE="${CMAKE_SOURCE_DIR}/docs/changes.md")
corvista_test(change_apply PARTS 2 LIBRARIES agent_change agent_core test_support SOURCES
  change/apply_command_test.cpp
  change/guarding_test.cpp
  change/in_force_test.cpp)
target_compile_definitions(change_apply_test PRIVATE ${agent_test_programs})
add_dependencies(change_apply_test cvagent corvista-guard corvista-hosttools corvista-rehearsal fake_plugin vantrelcvicoshwmi)
