# Options of the build and the flags every target shares.
option(CORVISTA_TESTS "Build the tests" ON)
option(CORVISTA_BENCH "Build the benchmarks (needs Google Benchmark)" OFF)
option(CORVISTA_SERVICE "Build the service and the history (needs libsystemd and SQLite)" ON)
option(CORVISTA_FUZZ "Build the fuzz targets (needs clang)" OFF)
set(CORVISTA_SANITIZE "" CACHE STRING "Sanitizers, as -fsanitize= takes them")

find_package(Threads REQUIRED)

# Where no package brings them; the programs look for them beside our own libraries, and so do these for what they load, by the old
# kind of run path.
if(CORVISTA_SERVICE AND CMAKE_SIZEOF_VOID_P EQUAL 4 AND CMAKE_LIBRARY_PATH AND NOT EXISTS ${CMAKE_LIBRARY_PATH}/libsystemd.so)
  message(FATAL_ERROR "32-bit libraries are missing: python3 tests/system/libraries.py ${CMAKE_LIBRARY_PATH}")
endif()

add_library(corvista_options INTERFACE)
target_include_directories(corvista_options INTERFACE ${CMAKE_SOURCE_DIR})
# -fno-gnu-unique: a unique symbol would keep the plug-in mapped after dlclose.
target_compile_options(corvista_options INTERFACE
  -Wall -Wextra -Wpedantic -Wshadow -Wnon-virtual-dtor -Woverloaded-virtual -Wold-style-cast
  -Wcast-qual -Wformat=2 -Wundef -Werror $<$<CXX_COMPILER_ID:GNU>:-fno-gnu-unique>)
# g++ collects its garbage again and again below half a gigabyte, which is one second in twelve of what a group of files takes.
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND CMAKE_UNITY_BUILD)
  add_compile_options(--param=ggc-min-heapsize=524288)
endif()
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

# One object library a component: the plug-in is linked from them, and so are the tests of that component.
function(corvista_component name)
  add_library(component_${name} OBJECT ${ARGN})
  corvista_precompile(component_${name})
  target_link_libraries(component_${name} PUBLIC corvista_framework PRIVATE corvista_options)
  set_property(GLOBAL APPEND PROPERTY CORVISTA_COMPONENTS component_${name})
endfunction()
