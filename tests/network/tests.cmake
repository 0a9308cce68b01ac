corvista_test(network_config SOURCES
  network/bonding_status_test.cpp
  network/dns_test.cpp
  network/esx_test.cpp
  network/interface_file_test.cpp
  network/ipv6_writer_test.cpp
  network/killed_writer.cpp
  network/routes_file_test.cpp
  network/saved_settings_test.cpp
  network/team_node_test.cpp
  network/teaming_queries_test.cpp
  network/writer_sample_test.cpp
  LIBRARIES plugin_code test_support)
# What the page on architecture shows is compiled from the page.
set(sample_page ${CMAKE_SOURCE_DIR}/docs/architecture.md)
set_property(DIRECTORY APPEND PROPERTY CMAKE_CONFIGURE_DEPENDS ${sample_page})
file(READ ${sample_page} text)
if(NOT text MATCHES "```cpp\n([^`]+)```")
  message(FATAL_ERROR "${sample_page} shows no writer")
endif()
file(CONFIGURE OUTPUT writer_sample/writer_sample.inc CONTENT "${CMAKE_MATCH_1}" @ONLY)
target_include_directories(network_config_test PRIVATE ${CMAKE_CURRENT_BINARY_DIR}/writer_sample)

corvista_test(network_queries SOURCES
  network/address_queries_test.cpp
  network/interface_lists_test.cpp
  network/kernel_network_test.cpp
  network/link_queries_test.cpp
  network/query_parse_test.cpp
  network/recorded_addresses_test.cpp
  network/recorded_dhcp_test.cpp
  network/recorded_ethtool_test.cpp
  network/recorded_ifconfig_test.cpp
  network/recorded_members_test.cpp
  network/recording.cpp
  network/route_queries_test.cpp
  LIBRARIES plugin_code test_support)

corvista_test(network_nodes SOURCES
  network/ip_config_node_test.cpp
  network/ip_config_writer_test.cpp
  network/ipv4_writer_test.cpp
  network/lan_endpoint_test.cpp
  support/failing_new.cpp
  LIBRARIES plugin_code test_support)

corvista_test(network_ports SOURCES
  network/bridge_rows_test.cpp
  network/command_count_test.cpp
  network/port_nodes_test.cpp
  network/port_walk_test.cpp
  support/failing_new.cpp
  LIBRARIES plugin_code test_support)
# The links of a real kernel are asked with our own classic tools too.
add_dependencies(network_queries_test corvista-hosttools)
