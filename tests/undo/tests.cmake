# What a change touches is saved and put back, in the fake host and its kernel.
corvista_test(undo PARTS 2 LIBRARIES agent_undo hosttools_library test_support SOURCES
  undo/files_test.cpp
  undo/network_test.cpp
  undo/records_test.cpp)
