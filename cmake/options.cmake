# Options of the build and the flags every target shares.
option(CORVISTA_TESTS "Build the tests" ON)
option(CORVISTA_BENCH "Build the benchmarks (needs Google Benchmark)" OFF)
option(CORVISTA_SERVICE "Build the service and the history (needs libsystemd and SQLite)" ON)
option(CORVISTA_FUZZ "Build the fuzz targets (needs clang)" OFF)
set(CORVISTA_SANITIZE "" CACHE STRING "Sanitizers, as -fsanitize= takes them")

find_package(Threads REQUIRED)

add_library(corvista_options INTERFACE)
target_include_directories(corvista_options INTERFACE ${CMAKE_SOURCE_DIR})
# -fno-gnu-unique: a unique symbol would keep the plug-in mapped after dlclose.
target_compile_options(corvista_options INTERFACE
  -Wall -Wextra -Wpedantic -Wshadow -Wnon-virtual-dtor -Woverloaded-virtual -Wold-style-cast
  -Wcast-qual -Wformat=2 -Wundef -Werror $<$<CXX_COMPILER_ID:GNU>:-fno-gnu-unique>)
target_compile_definitions(corvista_options INTERFACE _FILE_OFFSET_BITS=64)
target_link_libraries(corvista_options INTERFACE Threads::Threads)

if(CORVISTA_SANITIZE)
  add_compile_options(-fsanitize=${CORVISTA_SANITIZE} -fno-omit-frame-pointer -fno-sanitize-recover=all)
  # Instrumented code misleads these warnings of g++'s optimiser; the plain builds have them. clang++ does not know them.
  if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
    add_compile_options(-Wno-array-bounds -Wno-stringop-overflow -Wno-restrict -Wno-maybe-uninitialized)
  endif()
  add_link_options(-fsanitize=${CORVISTA_SANITIZE})
endif()

# One object library a room: the plug-in is linked from them, and so are the tests of that room.
function(corvista_room name)
  add_library(room_${name} OBJECT ${ARGN})
  target_link_libraries(room_${name} PUBLIC corvista_framework PRIVATE corvista_options)
  set_property(GLOBAL APPEND PROPERTY CORVISTA_ROOMS room_${name})
endfunction()
