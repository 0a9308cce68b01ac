corvista_test(cpu SOURCES
  cpu/processor_nodes_test.cpp
  LIBRARIES plugin_code test_support)
