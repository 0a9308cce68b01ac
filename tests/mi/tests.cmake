corvista_test(mi PARTS 2 SOURCES
  mi/command_gate_test.cpp
  mi/command_test.cpp
  mi/library_test.cpp
  mi/lifecycle_test.cpp
  mi/line_file_test.cpp
  mi/log_names_test.cpp
  mi/no_memory_test.cpp
  mi/operation_names.cpp
  mi/plugin_object_test.cpp
  mi/stopped_thread_test.cpp
  mi/temporary_file_test.cpp
  mi/text_test.cpp
  mi/texts_in_commands_test.cpp
  support/failing_new.cpp
  support/text_takers.cpp
  LIBRARIES plugin_code test_support LABELS threads)
target_compile_definitions(mi_test PRIVATE CORVISTA_PLUGIN="$<TARGET_FILE:vantrelcvicoshwmi>")
add_dependencies(mi_test vantrelcvicoshwmi)
