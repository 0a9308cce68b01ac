# That every planted defect still has its one place; the defects themselves take too long for every day (docs/testing.md).
find_package(Python3 3.9 REQUIRED COMPONENTS Interpreter)
add_test(NAME planted_defects COMMAND Python3::Interpreter -B ${CMAKE_CURRENT_LIST_DIR}/run --check)
add_test(NAME defect_patterns COMMAND Python3::Interpreter -B ${CMAKE_CURRENT_LIST_DIR}/pattern_test.py)
