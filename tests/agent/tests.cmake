add_library(fake_plugin MODULE agent/fake_plugin.cpp)
target_link_libraries(fake_plugin PRIVATE corvista_framework corvista_options)

# A second front end, to show what one costs.
add_executable(tiny_front_end agent/tiny_front_end.cpp)
target_link_libraries(tiny_front_end PRIVATE agent_core corvista_framework corvista_options)

set(agent_test_programs
  TINY_FRONT_END="$<TARGET_FILE:tiny_front_end>"
  CVAGENT_PROGRAM="$<TARGET_FILE:cvagent_whole>"
  CORVISTA_PLUGIN_FILE="$<TARGET_FILE:vantrelcvicoshwmi>"
  FAKE_PLUGIN_FILE="$<TARGET_FILE:fake_plugin>"
  FRAMEWORK_FILE="$<TARGET_FILE:corvista_framework>")

corvista_test(agent PARTS 2 LIBRARIES agent_cli agent_core test_support util SOURCES
  agent/catalogue_test.cpp
  agent/core_parts_test.cpp
  agent/event_program_test.cpp
  agent/host_tools_test.cpp
  agent/json_test.cpp
  agent/owners_test.cpp
  agent/plain_question_test.cpp
  agent/print_test.cpp
  agent/read_commands_test.cpp
  agent/data_directory_test.cpp
  agent/private_tmp_test.cpp
  agent/run_path_test.cpp
  agent/set_command_test.cpp
  agent/surroundings_attack_test.cpp
  agent/surroundings_test.cpp
  agent/team_test.cpp
  agent/terminal.cpp
  agent/tiny_front_end_test.cpp
  agent/tree_test.cpp
  agent/value_check_test.cpp
  agent/watch_command_test.cpp)
target_compile_definitions(agent_test PRIVATE ${agent_test_programs}
  HOSTTOOLS_PROGRAM="$<TARGET_FILE:corvista-hosttools>" CMAKE_PROGRAM="${CMAKE_COMMAND}")
add_dependencies(agent_test cvagent corvista-hosttools fake_plugin tiny_front_end vantrelcvicoshwmi)

corvista_test(agent_signals LIBRARIES test_support util SOURCES
  agent/signals_test.cpp
  agent/terminal.cpp
  agent/want_test.cpp)
target_compile_definitions(agent_signals_test PRIVATE ${agent_test_programs} FEW_PROCESSES_LIBRARY="$<TARGET_FILE:fewprocesses>")
add_dependencies(agent_signals_test cvagent fake_plugin fewprocesses vantrelcvicoshwmi)
# They promise an end within a second, which nobody keeps beside others that take all processors.
set_tests_properties(agent_signals PROPERTIES RUN_SERIAL TRUE)

corvista_test(agent_suse_host PARTS 3 LIBRARIES test_support SOURCES
  agent/alerts_told_test.cpp
  agent/suse_host_test.cpp
  agent/write_effects_test.cpp)
target_compile_definitions(agent_suse_host_test PRIVATE ${agent_test_programs})
add_dependencies(agent_suse_host_test cvagent vantrelcvicoshwmi)

corvista_test(agent_core LIBRARIES agent_cli agent_core test_support LABELS threads SOURCES
  agent/agent_test.cpp
  agent/calls_test.cpp)
target_compile_definitions(agent_core_test PRIVATE ${agent_test_programs})
add_dependencies(agent_core_test fake_plugin vantrelcvicoshwmi)

corvista_test(agent_lifetime LIBRARIES agent_cli agent_core test_support LABELS threads SOURCES
  agent/lifetime_test.cpp)
target_compile_definitions(agent_lifetime_test PRIVATE ${agent_test_programs})
add_dependencies(agent_lifetime_test fake_plugin vantrelcvicoshwmi)

# The tree on links of a real kernel, with our own adapters as a user's cvagent picks them.
corvista_test(agent_kernel_tree LIBRARIES agent_verify test_support SOURCES
  agent/kernel_told.cpp
  agent/kernel_tree_test.cpp
  agent/verify_test.cpp)
target_compile_definitions(agent_kernel_tree_test PRIVATE ${agent_test_programs})
add_dependencies(agent_kernel_tree_test cvagent vantrelcvicoshwmi corvista-hosttools)

corvista_test(agent_hostile PARTS 4 LIBRARIES agent_cli agent_core test_support LABELS threads SOURCES
  agent/command_deadline_test.cpp
  agent/interposed_test.cpp
  agent/hostile_output_test.cpp
  agent/hostile_surroundings_test.cpp
  agent/hostile_test.cpp
  agent/refused_name_test.cpp)
target_compile_definitions(agent_hostile_test PRIVATE ${agent_test_programs} CLOCK_JUMP_LIBRARY="$<TARGET_FILE:clockjump>")
add_dependencies(agent_hostile_test cvagent clockjump fake_plugin vantrelcvicoshwmi)

corvista_test(agent_many_interfaces LIBRARIES agent_cli agent_core plugin_code test_support SOURCES
  agent/many_interfaces_test.cpp)

# The plug-in of docs/plug-ins.md: the text of the document is what is compiled, loaded and read.
set_property(DIRECTORY APPEND PROPERTY CMAKE_CONFIGURE_DEPENDS ${CMAKE_SOURCE_DIR}/docs/plug-ins.md)
file(READ ${CMAKE_SOURCE_DIR}/docs/plug-ins.md plugins_page)
foreach(block cpp json)
  string(FIND "${plugins_page}" "```${block}\n" start)
  string(LENGTH "```${block}\n" fence)
  math(EXPR start "${start} + ${fence}")
  string(SUBSTRING "${plugins_page}" ${start} -1 rest)
  string(FIND "${rest}" "```" length)
  string(SUBSTRING "${rest}" 0 ${length} text)
  file(GENERATE OUTPUT ${CMAKE_BINARY_DIR}/example/$<IF:$<STREQUAL:${block},cpp>,uptime.cpp,libuptime.json> CONTENT "${text}")
endforeach()
add_library(uptime SHARED ${CMAKE_BINARY_DIR}/example/uptime.cpp)
target_link_libraries(uptime PRIVATE corvista_framework corvista_options)
set_target_properties(uptime PROPERTIES LIBRARY_OUTPUT_DIRECTORY ${CMAKE_BINARY_DIR}/example SOVERSION 1 UNITY_BUILD OFF
  BUILD_WITH_INSTALL_RPATH ON INSTALL_RPATH "$ORIGIN/../lib;$ORIGIN/../..")

corvista_test(agent_plugins PARTS 2 LIBRARIES agent_cli agent_core test_support LABELS threads SOURCES
  agent/catalogue_file_test.cpp
  agent/plugin_directory_test.cpp)
target_compile_definitions(agent_plugins_test PRIVATE ${agent_test_programs}
  HARDWARE_FILE="$<TARGET_FILE:corvistahardware>" UPTIME_FILE="$<TARGET_FILE:uptime>")
add_dependencies(agent_plugins_test corvistahardware cvagent fake_plugin uptime vantrelcvicoshwmi)
