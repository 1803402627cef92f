tester_library(tester-instrtests
  SOURCES
    instrtests/Answer.cpp
    instrtests/BlockReader.cpp
    instrtests/InterfaceSetup.cpp
    instrtests/PerformanceTest.cpp
    instrtests/RandomNumbers.cpp
    instrtests/ServiceRequest.cpp
    instrtests/Stress4882Test.cpp
    instrtests/StressMmemTest.cpp
    instrtests/TestLine.cpp
    instrtests/visatestfunctions.cpp
  LIBRARIES tester-visa tester-log tester-base
)
