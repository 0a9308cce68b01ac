corvista_test(golden PARTS 2 SOURCES
  hosts/golden_test.cpp
  LIBRARIES test_support)
target_compile_definitions(golden_test PRIVATE
  CORVISTA_TESTS_DIR="${CMAKE_SOURCE_DIR}/tests"
  CORVISTA_BUILD_DIR="${CMAKE_BINARY_DIR}"
  CVAGENT_PROGRAM="$<TARGET_FILE:cvagent_whole>"
  CORVISTA_PLUGIN_FILE="$<TARGET_FILE:vantrelcvicoshwmi>")
add_dependencies(golden_test corvista-hosttools cvagent vantrelcvicoshwmi)

corvista_test(one_truth LIBRARIES agent_core test_support SOURCES
  hosts/one_truth_test.cpp)
target_compile_definitions(one_truth_test PRIVATE CORVISTA_PLUGIN_FILE="$<TARGET_FILE:vantrelcvicoshwmi>")
add_dependencies(one_truth_test corvista-hosttools vantrelcvicoshwmi)
