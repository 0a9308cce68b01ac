# The plug-in: every component in one shared library that exports OpenMI and the processor builder, nothing else.
get_property(components GLOBAL PROPERTY CORVISTA_COMPONENTS)
set(objects)
foreach(component ${components})
  list(APPEND objects $<TARGET_OBJECTS:${component}>)
endforeach()
add_library(vantrelcvicoshwmi SHARED ${objects})
target_link_libraries(vantrelcvicoshwmi PRIVATE corvista_framework)
target_link_options(vantrelcvicoshwmi PRIVATE
  -Wl,--version-script=${CMAKE_SOURCE_DIR}/oshwmi/plugin.map -Wl,--no-undefined -Wl,--as-needed)
set_target_properties(vantrelcvicoshwmi PROPERTIES
  VERSION 1.0.0 SOVERSION 1 BUILD_WITH_INSTALL_RPATH ON INSTALL_RPATH "$ORIGIN" LINK_DEPENDS ${CMAKE_SOURCE_DIR}/oshwmi/plugin.map)
if(CORVISTA_SANITIZE)
  target_link_options(vantrelcvicoshwmi PRIVATE -Wl,--undefined-version -Wl,-z,undefs)
endif()
install(TARGETS vantrelcvicoshwmi LIBRARY DESTINATION ${CMAKE_INSTALL_LIBDIR} NAMELINK_SKIP)

# The same code for the tests, which reach below OpenMI.
add_library(plugin_code STATIC EXCLUDE_FROM_ALL ${objects})
target_link_libraries(plugin_code PUBLIC corvista_framework)
set_target_properties(plugin_code PROPERTIES LINKER_LANGUAGE CXX)
