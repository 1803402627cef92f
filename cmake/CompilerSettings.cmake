# Warnings, hardening and sanitizers for every target of the project.
find_package(Threads REQUIRED)


add_compile_options(-Wall -Wextra -Wpedantic -Wshadow -Wcast-align -Wformat=2 -Werror)
add_compile_options($<$<COMPILE_LANGUAGE:CXX>:-Woverloaded-virtual>)
add_compile_options($<$<CONFIG:RelWithDebInfo>:-fno-omit-frame-pointer>)

# Line tables are enough for stack traces and keep the build small.
set(CMAKE_C_FLAGS_RELWITHDEBINFO "-O2 -g1")
set(CMAKE_CXX_FLAGS_RELWITHDEBINFO "-O2 -g1")

if(KYVISA_SANITIZE)
  add_compile_options(-fsanitize=${KYVISA_SANITIZE} -fno-sanitize-recover=all -O1)
  add_link_options(-fsanitize=${KYVISA_SANITIZE})
  # gcc 12 reports false positives of these two when it instruments code.
  add_compile_options($<$<COMPILE_LANG_AND_ID:CXX,GNU>:-Wno-maybe-uninitialized> $<$<COMPILE_LANG_AND_ID:CXX,GNU>:-Wno-restrict>)
endif()
