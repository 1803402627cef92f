tester_library(tester-base
  SOURCES
    app/Data.h
    log/FastBuffer.h
    panels/Subject.cpp
    pipeline/VisaFunctionCall.cpp
    pipeline/VisaFunctionCallParameter.cpp
)
