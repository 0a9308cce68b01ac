# A change that is tried beforehand, in the fake host.
add_library(reaching_plugin MODULE change/reaching_plugin.cpp)
target_link_libraries(reaching_plugin PRIVATE corvista_framework corvista_options)

corvista_test(change PARTS 2 LIBRARIES agent_rehearsal agent_change agent_core hosttools_library test_support SOURCES
  change/fence_test.cpp
  change/plan_test.cpp
  change/plan_and_deed_test.cpp
  change/rehearsal_test.cpp
  change/rehearsed.cpp)
target_compile_definitions(change_test PRIVATE CORVISTA_PLUGIN_FILE="$<TARGET_FILE:vantrelcvicoshwmi>"
  REACHING_PLUGIN_FILE="$<TARGET_FILE:reaching_plugin>" REHEARSAL_PROGRAM="$<TARGET_FILE:corvista-rehearsal>"
  CORVISTA_TESTS_DIR="${CMAKE_SOURCE_DIR}/tests")
add_dependencies(change_test corvista-hosttools corvista-rehearsal reaching_plugin vantrelcvicoshwmi)
