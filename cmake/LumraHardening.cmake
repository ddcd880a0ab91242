# Target lumra_hardening: how all that is installed is compiled and linked, so that a fault is hard to abuse and no path
# of the machine that built it is inside.
include(CheckCXXCompilerFlag)
include(CheckPIESupported)
check_pie_supported()

add_library(lumra_hardening INTERFACE)
target_compile_options(lumra_hardening INTERFACE -fstack-protector-strong
  -ffile-prefix-map=${PROJECT_SOURCE_DIR}=. -ffile-prefix-map=${PROJECT_BINARY_DIR}=build)
target_link_options(lumra_hardening INTERFACE LINKER:-z,relro LINKER:-z,now LINKER:-z,noexecstack
  LINKER:-z,separate-code)

# What not every processor has. The linker marks a file as ready for branch and shadow-stack checks when all of its
# objects are: ours are, MKL's static objects are not, so that the library goes without the mark; forcing it would let
# MKL's jumps end the process.
foreach(flag -fcf-protection=full -fstack-clash-protection)
  string(MAKE_C_IDENTIFIER "LUMRA_HAS${flag}" has)
  check_cxx_compiler_flag(${flag} ${has})
  target_compile_options(lumra_hardening INTERFACE $<$<BOOL:${${has}}>:${flag}>)
endforeach()

# Sanitizers look at the same calls themselves, and better.
if(NOT LUMRA_SANITIZE)
  set(fortify 2)
  if((CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND CMAKE_CXX_COMPILER_VERSION VERSION_GREATER_EQUAL 12)
      OR (CMAKE_CXX_COMPILER_ID STREQUAL "Clang" AND CMAKE_CXX_COMPILER_VERSION VERSION_GREATER_EQUAL 9))
    set(fortify 3)
  endif()
  target_compile_options(lumra_hardening INTERFACE
    $<$<CONFIG:Release,RelWithDebInfo,MinSizeRel>:-U_FORTIFY_SOURCE -D_FORTIFY_SOURCE=${fortify}>)
endif()
