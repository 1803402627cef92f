tester_library(tester-app
  SOURCES
    app/File.cpp
    app/MainWindow.cpp
    app/PageTabs.cpp
    app/SessionInstanceTab.cpp
  LIBRARIES tester-testpage tester-dialogs tester-panels tester-logview tester-worker tester-log tester-base Qt5::Widgets
)
