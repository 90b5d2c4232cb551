# Compile and link settings shared by every target, as an interface library, and the helpers that use it.

add_library(tavik_options INTERFACE)

# Includes are written from the root ("common/include/Pointer.h"), and __FILE__ is a path from the root, whatever the
# build directory: the log takes its file labels from it.
target_include_directories(tavik_options INTERFACE ${PROJECT_SOURCE_DIR})
target_compile_options(tavik_options INTERFACE
  -fmacro-prefix-map=${PROJECT_SOURCE_DIR}/=
  -Wall -Wextra -Wpedantic -Wconversion -Wshadow
  $<$<BOOL:${TAVIK_WARNINGS_AS_ERRORS}>:-Werror>)

# g++ 12 sees overlapping and overlong copies inside std::string and std::vector where there are none (its bugs 105651 and
# 105562).
if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU" AND CMAKE_CXX_COMPILER_VERSION VERSION_LESS 13)
  target_compile_options(tavik_options INTERFACE
    $<$<COMPILE_LANGUAGE:CXX>:-Wno-restrict -Wno-stringop-overread -Wno-array-bounds>)
endif()

if(CMAKE_CXX_COMPILER_ID STREQUAL "Clang")
  target_compile_options(tavik_options INTERFACE -Wthread-safety)
endif()

if(TAVIK_SANITIZE)
  target_compile_options(tavik_options INTERFACE
    -fsanitize=${TAVIK_SANITIZE} -fno-sanitize-recover=all -fno-omit-frame-pointer -g -O1)
  if(CMAKE_CXX_COMPILER_ID STREQUAL "GNU")
    # What the sanitizers insert hides from g++ that a value is set; the other builds have the warning.
    target_compile_options(tavik_options INTERFACE -Wno-maybe-uninitialized)
  endif()
  target_link_options(tavik_options INTERFACE -fsanitize=${TAVIK_SANITIZE})
else()
  target_compile_options(tavik_options INTERFACE -fstack-protector-strong
    $<$<CONFIG:Release,RelWithDebInfo>:-U_FORTIFY_SOURCE -D_FORTIFY_SOURCE=2>)
  target_link_options(tavik_options INTERFACE -Wl,-z,relro,-z,now -Wl,-z,noexecstack)
endif()

# Everything counts what it reaches, for scripts/coverage. Each program has a line of its own for ends by _exit.
if(TAVIK_COVERAGE)
  target_compile_options(tavik_options INTERFACE --coverage -fprofile-update=atomic)
  target_link_options(tavik_options INTERFACE --coverage)
  target_sources(tavik_options INTERFACE
    $<$<STREQUAL:$<TARGET_PROPERTY:TYPE>,EXECUTABLE>:${PROJECT_SOURCE_DIR}/cmake/CoverageExit.cpp>)
endif()

# Everything counts its edges for libFuzzer; the fuzzers themselves link the engine (fuzz/CMakeLists.txt).
if(TAVIK_FUZZ)
  if(NOT CMAKE_CXX_COMPILER_ID STREQUAL "Clang")
    message(FATAL_ERROR "TAVIK_FUZZ needs clang++: use the preset fuzz")
  endif()
  target_compile_options(tavik_options INTERFACE -fsanitize=fuzzer-no-link)
  target_link_options(tavik_options INTERFACE -fsanitize=fuzzer-no-link)
endif()

# tavik_library(NAME SOURCES ... [LINK ...]): a static library of the framework or the agent.
function(tavik_library aName)
  cmake_parse_arguments(PARSE_ARGV 1 lArg "" "" "SOURCES;LINK")
  add_library(${aName} STATIC ${lArg_SOURCES})
  target_link_libraries(${aName} PUBLIC tavik_options Threads::Threads ${lArg_LINK})
endfunction()

# tavik_test(NAME SOURCES ... [LINK ...] [TIMEOUT seconds] [LABELS ...]): a GoogleTest program, each case a test of CTest,
# labelled "unit" unless told otherwise.
function(tavik_test aName)
  cmake_parse_arguments(PARSE_ARGV 1 lArg "" "TIMEOUT" "SOURCES;LINK;LABELS")
  if(NOT lArg_TIMEOUT)
    set(lArg_TIMEOUT 60)
  endif()
  if(NOT lArg_LABELS)
    set(lArg_LABELS unit)
  endif()
  add_executable(${aName} ${lArg_SOURCES})
  target_link_libraries(${aName} PRIVATE tavik_options ${lArg_LINK} GTest::gmock GTest::gtest_main)
  # What is tested is optimised in full; the tests themselves need not wait for it.
  target_compile_options(${aName} PRIVATE $<$<CONFIG:Release>:-O1>)
  gtest_discover_tests(${aName} DISCOVERY_MODE PRE_TEST DISCOVERY_TIMEOUT 60
    PROPERTIES TIMEOUT ${lArg_TIMEOUT} LABELS "${lArg_LABELS}")
endfunction()
