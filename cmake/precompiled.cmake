# The standard headers that most of the product's files want, compiled beforehand where files are compiled for the tests. A component
# that is compiled as one would only pay for it. Elsewhere (release, clang-tidy) each file has to include what it uses.
function(corvista_precompile target)
  get_target_property(together ${target} UNITY_BUILD)
  if(NOT CMAKE_UNITY_BUILD OR NOT CMAKE_CXX_COMPILER_ID STREQUAL "GNU" OR (together AND NOT CMAKE_UNITY_BUILD_BATCH_SIZE))
    return()
  endif()
  get_property(first GLOBAL PROPERTY CORVISTA_PRECOMPILED)
  if(first)
    target_precompile_headers(${target} REUSE_FROM ${first})
  else()
    target_precompile_headers(${target} PRIVATE <algorithm> <array> <chrono> <filesystem> <functional> <map> <memory> <mutex>
      <optional> <set> <string> <thread> <vector>)
    set_property(GLOBAL PROPERTY CORVISTA_PRECOMPILED ${target})
  endif()
endfunction()
