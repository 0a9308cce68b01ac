# What a change touches is saved and put back, in the fake host and its kernel.
corvista_test(undo PARTS 2 LIBRARIES agent_undo hosttools_library test_support SOURCES
  undo/files_test.cpp
  undo/guard_test.cpp
  undo/keeper_calls_test.cpp
  undo/killed_at.cpp
  undo/network_test.cpp
  undo/records_test.cpp)
target_compile_definitions(undo_test PRIVATE GUARD_PROGRAM="$<TARGET_FILE:corvista-guard>")
add_dependencies(undo_test corvista-guard)
