tester_library(tester-log
  SOURCES
    log/Lock.cpp
    log/Log.cpp
    log/LogFile.cpp
    log/MessageQueue.cpp
    log/SessionLog.cpp
    log/StringMessageQueue.cpp
  LIBRARIES tester-base
)
