tester_library(tester-config
  SOURCES
    config/ConfigEncoding.cpp
    config/ConfigTemplate.cpp
    config/KyVisaTextConfigure.cpp
    config/kyconfigfile.cpp
  LIBRARIES Qt5::Widgets
)
