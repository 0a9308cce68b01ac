corvista_test(rules SOURCES
  rules/rules_test.cpp)
# Of the file, not of the program: all programs share this one's precompiled headers, and what is defined is part of those.
set_source_files_properties(rules/rules_test.cpp PROPERTIES COMPILE_DEFINITIONS CORVISTA_SOURCE_DIR="${CMAKE_SOURCE_DIR}")
