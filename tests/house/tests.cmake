corvista_test(house SOURCES
  house/house_test.cpp)
target_compile_definitions(house_test PRIVATE CORVISTA_SOURCE_DIR="${CMAKE_SOURCE_DIR}")
