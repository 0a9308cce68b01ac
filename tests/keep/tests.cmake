# Who keeps the configuration of an interface.
if(CORVISTA_SERVICE)
  corvista_test(keep LIBRARIES agent_keep agent_service agent_core agent_bus hosttools_library test_support SOURCES
    keep/editors_test.cpp
    keep/host_settings_test.cpp
    keep/keeper_test.cpp
    keep/manager_test.cpp
    keep/manager_way_test.cpp
    keep/mock_manager.cpp
    keep/profile_test.cpp
    keep/resolver_test.cpp
    keep/set_host_test.cpp
    keep/set_test.cpp
    keep/way_test.cpp)
  target_compile_definitions(keep_test PRIVATE ${agent_test_programs} REHEARSAL_PROGRAM="$<TARGET_FILE:corvista-rehearsal>")
  add_dependencies(keep_test cvagent corvista-guard corvista-rehearsal corvista-hosttools vantrelcvicoshwmi)
endif()
