tester_library(tester-visa
  SOURCES
    visa/CallBackLog.cpp
    visa/VisaSessionWithLog.cpp
  LIBRARIES tester-log tester-base
)
