if(CORVISTA_SERVICE)
  corvista_test(history LIBRARIES agent_history agent_core test_support util LABELS threads SOURCES
    history/event_keeping_test.cpp
    history/history_command_test.cpp
    history/history_files_test.cpp
    history/history_test.cpp
    history/kept_alerts_test.cpp
    history/recorder_test.cpp)
  target_compile_definitions(history_test PRIVATE ${agent_test_programs})
  add_dependencies(history_test cvagent fake_plugin vantrelcvicoshwmi)
endif()
