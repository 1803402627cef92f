tester_library(tester-testpage
  SOURCES
    instrtests/TestFunctionWidget.cpp
    instrtests/TestTab.cpp
  LIBRARIES tester-instrtests tester-dialogs tester-panels tester-pipeline tester-log Qt5::Widgets
)
