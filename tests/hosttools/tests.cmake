# What is preloaded into the system's own ethtool is free of sanitizers, as that is.
add_library(fake_ethtool_kernel SHARED hosttools/fake_ethtool_kernel.cpp)
target_link_libraries(fake_ethtool_kernel PRIVATE corvista_options ${CMAKE_DL_LIBS})
target_compile_options(fake_ethtool_kernel PRIVATE -fno-sanitize=all -fvisibility=default)
target_link_options(fake_ethtool_kernel PRIVATE -fno-sanitize=all -Wl,--as-needed)

add_executable(ethtool_by_calls hosttools/ethtool_by_calls.cpp)
target_link_libraries(ethtool_by_calls PRIVATE hosttools)

corvista_test(hosttools LIBRARIES hosttools SOURCES
  hosttools/addresses_test.cpp
  hosttools/against_busybox_test.cpp
  hosttools/against_real_tools_test.cpp
  hosttools/disks_test.cpp
  hosttools/ethtool_test.cpp
  hosttools/fdisk_listing_test.cpp
  hosttools/fdisk_tool_test.cpp
  hosttools/files_test.cpp
  hosttools/handed_over_test.cpp
  hosttools/host_tree.cpp
  hosttools/ifconfig_listing_test.cpp
  hosttools/interfaces_test.cpp
  hosttools/netlink_test.cpp
  hosttools/network_namespace.cpp
  hosttools/partition_table_test.cpp
  hosttools/process.cpp
  hosttools/route_listing_test.cpp
  hosttools/text_test.cpp
  hosttools/wired_test.cpp)
target_compile_definitions(hosttools_test PRIVATE
  ETHTOOL_BY_CALLS="$<TARGET_FILE:ethtool_by_calls>" FAKE_ETHTOOL_KERNEL="$<TARGET_FILE:fake_ethtool_kernel>"
  HOSTTOOLS_PROGRAM="$<TARGET_FILE:corvista-hosttools>"
  HOSTTOOLS_ADAPTERS="$<TARGET_FILE_DIR:corvista-hosttools>/adapters" HOSTTOOLS_RECORDINGS="${CMAKE_CURRENT_LIST_DIR}")
add_dependencies(hosttools_test corvista-hosttools ethtool_by_calls fake_ethtool_kernel)
# The kernel's header of interfaces and the C library's do not go together.
set_source_files_properties(hosttools/ifconfig_listing_test.cpp PROPERTIES SKIP_UNITY_BUILD_INCLUSION ON)
