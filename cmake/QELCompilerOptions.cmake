# qel_options carries the warnings and sanitizers that everything of ours is built with; qel_warnings
# only the warnings, for what is loaded into a program beside its sanitizers.
add_library(qel_warnings INTERFACE)
target_compile_options(qel_warnings INTERFACE -Wall -Wextra -Wpedantic -Wshadow -Wconversion)

if(QEL_WERROR)
  target_compile_options(qel_warnings INTERFACE -Werror)
endif()

add_library(qel_options INTERFACE)
target_link_libraries(qel_options INTERFACE qel_warnings)

if(QEL_SANITIZE)
  target_compile_options(qel_options INTERFACE -fsanitize=${QEL_SANITIZE} -fno-sanitize-recover=all -fno-omit-frame-pointer)
  # Through the instrumentation g++ takes initialised members for uninitialised ones.
  target_compile_options(qel_options INTERFACE $<$<CXX_COMPILER_ID:GNU>:-Wno-maybe-uninitialized>)
  target_link_options(qel_options INTERFACE -fsanitize=${QEL_SANITIZE})
endif()

# Coverage for the fuzzer; its own main is linked into the fuzz targets alone.
if(QEL_BUILD_FUZZERS)
  target_compile_options(qel_options INTERFACE -fsanitize=fuzzer-no-link)
  target_link_options(qel_options INTERFACE -fsanitize=fuzzer-no-link)
endif()
