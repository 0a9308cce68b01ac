corvista_test(rules SOURCES
  rules/rules_test.cpp)
# Of the file, not of the program: all programs share this one's precompiled headers, and what is defined is part of those.
set_source_files_properties(rules/rules_test.cpp PROPERTIES COMPILE_DEFINITIONS CORVISTA_SOURCE_DIR="${CMAKE_SOURCE_DIR}")
# What a change can reach, as scripts/test asks it.
find_package(Python3 3.9 REQUIRED COMPONENTS Interpreter)
add_test(NAME reached COMMAND Python3::Interpreter -B ${CMAKE_CURRENT_LIST_DIR}/reached_test.py ${CMAKE_BINARY_DIR})
