corvista_test(indications SOURCES
  indications/alerts_test.cpp
  indications/comparison_test.cpp
  indications/kernel_links_test.cpp
  indications/link_states_test.cpp
  indications/network_monitor_test.cpp
  indications/recorded_bond_test.cpp
  indications/state_file_test.cpp
  support/failing_new.cpp
  LIBRARIES plugin_code test_support LABELS threads)
# The links of a real kernel are asked with our own classic tools too.
add_dependencies(indications_test corvista-hosttools)
