tester_library(tester-dialogs
  SOURCES
    finder/DeviceKey.cpp
    finder/ResourceDialog.cpp
    finder/SearchResult.cpp
    log/LogFileOptionsDialog.cpp
    log/LogFileOptionsDialog.ui
  LIBRARIES tester-panels tester-pipeline tester-log Qt5::Widgets
)
set_target_properties(tester-dialogs PROPERTIES AUTOUIC ON)
