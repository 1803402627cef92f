tester_library(tester-logview
  SOURCES log/LogTextDisplay.cpp
  LIBRARIES tester-log tester-pipeline Qt5::Widgets
)
