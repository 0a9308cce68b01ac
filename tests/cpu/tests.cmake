corvista_test(cpu SOURCES
  cpu/processor_nodes_test.cpp
  support/failing_new.cpp
  LIBRARIES plugin_code test_support)
