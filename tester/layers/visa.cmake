tester_library(tester-visa
  SOURCES
    visa/CallBackLog.cpp
    visa/VisaSessionWithLog.cpp
  LIBRARIES tester-log tester-base
)
# A library that lacks an operation is found out when the program starts, not when the operation is first used.
target_link_options(tester-visa INTERFACE LINKER:-z,now)
