corvista_test(mi SOURCES
  mi/command_test.cpp
  mi/library_test.cpp
  mi/lifecycle_test.cpp
  mi/line_file_test.cpp
  mi/no_memory_test.cpp
  mi/stopped_thread_test.cpp
  mi/text_test.cpp
  support/failing_new.cpp
  LIBRARIES plugin_code test_support LABELS threads)
target_compile_definitions(mi_test PRIVATE CORVISTA_PLUGIN="$<TARGET_FILE:vantrelcvicoshwmi>")
add_dependencies(mi_test vantrelcvicoshwmi)
