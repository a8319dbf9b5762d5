# How everything here is compiled: the language, the warnings, the hardening and the sanitizers. Targets take it by linking to `tally_compiler`.
set(CMAKE_CXX_STANDARD 20)
set(CMAKE_CXX_STANDARD_REQUIRED ON)
set(CMAKE_CXX_EXTENSIONS OFF)
set(CMAKE_C_STANDARD 11)
set(CMAKE_POSITION_INDEPENDENT_CODE ON)
set(CMAKE_CXX_VISIBILITY_PRESET hidden)
set(CMAKE_C_VISIBILITY_PRESET hidden)
set(CMAKE_VISIBILITY_INLINES_HIDDEN ON)
set(CMAKE_EXPORT_COMPILE_COMMANDS ON)

include(CheckPIESupported)
check_pie_supported()

add_library(tally_compiler INTERFACE)
target_include_directories(tally_compiler INTERFACE
  "${PROJECT_SOURCE_DIR}" "${PROJECT_SOURCE_DIR}/knvlibs/include")
target_compile_options(tally_compiler INTERFACE
  -Wall -Wextra -Wpedantic -Wshadow -Wconversion $<$<BOOL:${TALLY_WERROR}>:-Werror>)
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND CMAKE_CXX_COMPILER_VERSION VERSION_LESS 13)
  # It takes std::string's operator+ for a copy onto itself.
  target_compile_options(tally_compiler INTERFACE -Wno-restrict)
endif()

# Where the sources lay when they were built shows in no release.
if(NOT TALLY_COVERAGE)
  target_compile_options(tally_compiler INTERFACE "$<$<CONFIG:Release,RelWithDebInfo>:\
-ffile-prefix-map=${PROJECT_SOURCE_DIR}/=;-ffile-prefix-map=${PROJECT_BINARY_DIR}=build>")
endif()

if(TALLY_COVERAGE)
  target_compile_options(tally_compiler INTERFACE --coverage)
  target_link_options(tally_compiler INTERFACE --coverage)
endif()

if(TALLY_SANITIZE)
  target_compile_options(tally_compiler INTERFACE
    "-fsanitize=${TALLY_SANITIZE}" -fno-sanitize-recover=all -fno-omit-frame-pointer)
  target_link_options(tally_compiler INTERFACE "-fsanitize=${TALLY_SANITIZE}")
else()
  include(TallyHardening)
  # libstdc++ inside the program: a third less time to start. Of it only what is called.
  target_link_options(tally_compiler INTERFACE
    "$<$<LINK_LANGUAGE:CXX>:-static-libstdc++;-static-libgcc;LINKER:--gc-sections>")
endif()
