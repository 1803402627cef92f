tester_library(tester-pipeline
  SOURCES
    pipeline/VisaDispatcher.cpp
    pipeline/VisaFunctionCallButton.cpp
    pipeline/VisaFunctionCallCreator.cpp
    pipeline/VisaFunctionCallHandler.cpp
    pipeline/VisaFunctionCallListener.cpp
  LIBRARIES tester-base Qt5::Widgets
)
