# What makes a mistake end the program instead of serving an attacker: of it, all that the compiler has.
include(CheckCXXCompilerFlag)
include(CheckCXXSourceCompiles)

foreach(flag -fstack-protector-strong -fstack-clash-protection -fcf-protection)
  string(MAKE_C_IDENTIFIER "TALLY_HAS${flag}" has)
  check_cxx_compiler_flag("-Werror ${flag}" ${has})
  if(${has})
    target_compile_options(tally_compiler INTERFACE ${flag})
  endif()
endforeach()
target_compile_definitions(tally_compiler INTERFACE _GLIBCXX_ASSERTIONS)

# A C library that does not know level 3 warns and takes it for 2.
set(CMAKE_REQUIRED_FLAGS "-O2 -Werror -U_FORTIFY_SOURCE -D_FORTIFY_SOURCE=3")
check_cxx_source_compiles("#include <cstdio>\nint main() {}" TALLY_HAS_FORTIFY_3)
unset(CMAKE_REQUIRED_FLAGS)
set(level "$<IF:$<BOOL:${TALLY_HAS_FORTIFY_3}>,3,2>")
target_compile_options(tally_compiler INTERFACE
  "$<$<CONFIG:Release,RelWithDebInfo>:-U_FORTIFY_SOURCE;-D_FORTIFY_SOURCE=${level}>")

target_link_options(tally_compiler INTERFACE LINKER:-z,relro,-z,now,-z,noexecstack)
