# Fails when a C++ source under SOURCE_DIR is compiled by no target, that is, does not stand in COMPILE_COMMANDS: a test
# that is not in the build passes for ever.
#
# cmake -DSOURCE_DIR=... -DCOMPILE_COMMANDS=... -P CheckTestSources.cmake

file(READ "${COMPILE_COMMANDS}" lCommands)
file(GLOB_RECURSE lSources "${SOURCE_DIR}/*.cpp" "${SOURCE_DIR}/*.cc" "${SOURCE_DIR}/*.c")
list(FILTER lSources EXCLUDE REGEX "/vm/module/")  # the kernel's own build makes it
list(LENGTH lSources lCount)
if(lCount EQUAL 0)
  message(FATAL_ERROR "no test sources in ${SOURCE_DIR}")
endif()

set(lMissing "")
foreach(lSource IN LISTS lSources)
  string(FIND "${lCommands}" "\"file\": \"${lSource}\"" lPosition)
  if(lPosition EQUAL -1)
    list(APPEND lMissing "${lSource}")
  endif()
endforeach()
if(lMissing)
  list(JOIN lMissing "\n  " lText)
  message(FATAL_ERROR "not in the build:\n  ${lText}")
endif()
message(STATUS "${lCount} test sources, all in the build")
