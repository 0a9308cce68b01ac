corvista_test(framework LABELS threads SOURCES
  framework/strings_test.cpp)
