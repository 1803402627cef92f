tester_library(tester-worker
  SOURCES
    instrtests/TestFunctionThread.cpp
    pipeline/VisaSessionWorker.cpp
    pipeline/VisaThread.cpp
  LIBRARIES tester-instrtests tester-pipeline tester-visa tester-log
)
