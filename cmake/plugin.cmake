# The plug-in: every room in one shared library that exports OpenMI and the processor builder, nothing else.
get_property(rooms GLOBAL PROPERTY CORVISTA_ROOMS)
add_library(vantrelcvicoshwmi SHARED)
target_link_libraries(vantrelcvicoshwmi PRIVATE ${rooms} corvista_framework)
target_link_options(vantrelcvicoshwmi PRIVATE
  -Wl,--version-script=${CMAKE_SOURCE_DIR}/mi/plugin.map -Wl,--no-undefined -Wl,--as-needed)
set_target_properties(vantrelcvicoshwmi PROPERTIES
  VERSION 1.0.0 SOVERSION 1 LINK_DEPENDS ${CMAKE_SOURCE_DIR}/mi/plugin.map)
if(CORVISTA_SANITIZE)
  target_link_options(vantrelcvicoshwmi PRIVATE -Wl,--undefined-version -Wl,-z,undefs)
endif()
install(TARGETS vantrelcvicoshwmi LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR} NAMELINK_SKIP)
