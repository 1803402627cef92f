tester_library(tester-worker
  SOURCES
    pipeline/VisaSessionWorker.cpp
    pipeline/VisaThread.cpp
  LIBRARIES tester-pipeline tester-visa tester-log
)
