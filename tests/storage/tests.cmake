corvista_test(storage SOURCES
  storage/drive_monitor_test.cpp
  storage/drive_nodes_test.cpp
  storage/layout_comparison_test.cpp
  storage/no_memory_test.cpp
  storage/partition_nodes_test.cpp
  storage/rebuild_stress_test.cpp
  storage/recorded_hosts_test.cpp
  storage/storage_host.cpp
  support/failing_new.cpp
  LIBRARIES plugin_code test_support LABELS threads)
