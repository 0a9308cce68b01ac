corvista_test(golden SOURCES
  hosts/golden_test.cpp
  LIBRARIES test_support)
target_compile_definitions(golden_test PRIVATE
  CORVISTA_TESTS_DIR="${CMAKE_SOURCE_DIR}/tests"
  CORVISTA_BUILD_DIR="${CMAKE_BINARY_DIR}"
  CVAGENT_PROGRAM="$<TARGET_FILE:cvagent>"
  CORVISTA_PLUGIN_FILE="$<TARGET_FILE:vantrelcvicoshwmi>")
add_dependencies(golden_test corvista-hosttools cvagent vantrelcvicoshwmi)
