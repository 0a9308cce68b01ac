# The agent as a service, on a bus of its own in the fake host.
if(CORVISTA_SERVICE)
  corvista_test(service LIBRARIES agent_service agent_core agent_bus test_support LABELS threads SOURCES
    service/attack_test.cpp
    service/bus_test.cpp
    service/change_calls_test.cpp
    service/config_test.cpp
    service/consent_test.cpp
    service/host_links_test.cpp
    service/interface_test.cpp
    service/model_test.cpp
    service/objects_test.cpp
    service/private_bus_test.cpp
    service/service_test.cpp
    service/service_run.cpp
    service/unread_test.cpp
    service/workers_test.cpp
    service/write_test.cpp)
  target_compile_definitions(service_test PRIVATE ${agent_test_programs} CVAGENTD_PROGRAM="$<TARGET_FILE:cvagentd>"
    HARDWARE_FILE="$<TARGET_FILE:corvistahardware>" INTERFACE_FILE="${CMAKE_SOURCE_DIR}/packaging/com.vantrel.Corvista1.xml"
    PACKAGING_DIR="${CMAKE_SOURCE_DIR}/packaging")
  add_dependencies(service_test cvagent cvagentd corvista-hosttools corvista-rehearsal fake_plugin corvistahardware tiny_front_end vantrelcvicoshwmi)

  # With polkit itself, and with one that asks.
  foreach(kind polkitd dbusmock)
    add_test(NAME service_${kind} COMMAND ${CMAKE_CURRENT_SOURCE_DIR}/service/polkit_test.py ${kind} $<TARGET_FILE:cvagentd> $<TARGET_FILE:fake_plugin>)
    set_tests_properties(service_${kind} PROPERTIES SKIP_RETURN_CODE 77 TIMEOUT 300)
  endforeach()

  # On links of a real kernel.
  corvista_test(service_freshness LIBRARIES agent_service agent_core agent_bus test_support SOURCES
    service/fresh_facts_test.cpp
    service/freshness_test.cpp
    service/service_run.cpp)
  target_compile_definitions(service_freshness_test PRIVATE ${agent_test_programs} CVAGENTD_PROGRAM="$<TARGET_FILE:cvagentd>"
    HARDWARE_FILE="$<TARGET_FILE:corvistahardware>")
  add_dependencies(service_freshness_test cvagent cvagentd corvistahardware vantrelcvicoshwmi corvista-hosttools)

  # Over a long time; see scripts/endurance.
  corvista_test(service_endurance LIBRARIES agent_service agent_history agent_core agent_bus test_support SOURCES
    service/endurance_test.cpp
    service/service_run.cpp)
  target_compile_definitions(service_endurance_test PRIVATE ${agent_test_programs} CVAGENTD_PROGRAM="$<TARGET_FILE:cvagentd>"
    HARDWARE_FILE="$<TARGET_FILE:corvistahardware>")
  add_dependencies(service_endurance_test cvagent cvagentd fake_plugin vantrelcvicoshwmi corvista-hosttools)

  # Changes that are taken back, on links of a real kernel.
  corvista_test(service_taking_back PARTS 2 LIBRARIES agent_service agent_core agent_bus test_support SOURCES
    service/service_run.cpp
    service/taking_back_test.cpp)
  target_compile_definitions(service_taking_back_test PRIVATE ${agent_test_programs} CVAGENTD_PROGRAM="$<TARGET_FILE:cvagentd>"
    HARDWARE_FILE="$<TARGET_FILE:corvistahardware>")
  add_dependencies(service_taking_back_test cvagent cvagentd corvista-guard corvista-hosttools corvista-rehearsal vantrelcvicoshwmi)

  # The command line as its client.
  corvista_test(service_client LIBRARIES agent_cli agent_service agent_core agent_bus test_support SOURCES
    service/command_line_test.cpp
    service/service_run.cpp)
  target_compile_definitions(service_client_test PRIVATE ${agent_test_programs} QUICK_PROGRAM="$<TARGET_FILE:cvagent>" CVAGENTD_PROGRAM="$<TARGET_FILE:cvagentd>"
    HARDWARE_FILE="$<TARGET_FILE:corvistahardware>")
  add_dependencies(service_client_test cvagent cvagentd corvista-rehearsal fake_plugin corvistahardware vantrelcvicoshwmi)
endif()
