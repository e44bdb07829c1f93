# qel_options carries the warnings, the sanitizers and the hardening that everything of ours is built with;
# qel_warnings only the warnings, for what is loaded into a program beside its sanitizers.
include(CheckCXXCompilerFlag)
include(CheckLinkerFlag)

# Files of any size and dates beyond 2038, also where neither is the default.
if(CMAKE_SIZEOF_VOID_P EQUAL 4)
  add_compile_definitions(_FILE_OFFSET_BITS=64 _TIME_BITS=64)
endif()

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

# What Debian hardens its packages with, in the form that people run; docs/performance.md shows what it costs.
# The checked functions of the C library hide from the sanitizers what these look for.
if(QEL_HARDENING AND CMAKE_BUILD_TYPE STREQUAL "Release" AND NOT QEL_SANITIZE)
  # A processor or a compiler may lack one: -fcf-protection is for x86 alone.
  foreach(flag -fPIE -fstack-protector-strong -fstack-clash-protection -fcf-protection)
    string(MAKE_C_IDENTIFIER "QEL_HAS${flag}" has_flag)
    check_cxx_compiler_flag(${flag} ${has_flag})
    if(${has_flag})
      target_compile_options(qel_options INTERFACE ${flag})
    endif()
  endforeach()
  target_compile_options(qel_options INTERFACE -U_FORTIFY_SOURCE -D_FORTIFY_SOURCE=2)
  foreach(flag -pie LINKER:-z,relro LINKER:-z,now)
    string(MAKE_C_IDENTIFIER "QEL_LINKS_WITH_${flag}" has_flag)
    check_linker_flag(CXX ${flag} ${has_flag})
    if(${has_flag})
      target_link_options(qel_options INTERFACE ${flag})
    endif()
  endforeach()
endif()
