corvista_test(network_config SOURCES
  network/bonding_status_test.cpp
  network/command_lines.cpp
  network/dns_test.cpp
  network/esx_test.cpp
  network/interface_file_test.cpp
  network/ipv6_writer_test.cpp
  network/killed_writer.cpp
  network/routes_file_test.cpp
  network/saved_settings_test.cpp
  network/team_node_test.cpp
  network/teaming_queries_test.cpp
  LIBRARIES plugin_code test_support)
