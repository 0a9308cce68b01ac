corvista_test(undo_commands PARTS 2 LIBRARIES test_support SOURCES
  agent/terminal.cpp
  undo/commands_test.cpp)
target_compile_definitions(undo_commands_test PRIVATE ${agent_test_programs})
add_dependencies(undo_commands_test cvagent corvista-guard corvista-hosttools corvista-rehearsal vantrelcvicoshwmi)
