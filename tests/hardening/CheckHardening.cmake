# Says which properties a built file lacks, and fails where these are not the expected ones:
#   pie              position-independent, so that its place in memory can be random
#   relro            its relocation tables are read-only once it is loaded
#   bind-now         all of them are filled in before it starts, so that relro covers them whole
#   noexecstack      its stack is not executable
#   no-textrel       its code is never written to
#   stack-protector  functions with buffers guard their return addresses
#   fortify          calls that fill buffers of a known size are checked against it
#
# cmake -DFILE=... -DREADELF=... -DPROPERTIES=LIST [-DMISSING=LIST] -P CheckHardening.cmake
#
# A LIST has commas between its words.
#
# fortify and stack-protector are seen by the functions that such code calls; PROPERTIES leaves fortify out for a file
# that has nothing to check.

cmake_minimum_required(VERSION 3.25)

# Runs readelf with these options on the file.
function(read_elf aOut)
  execute_process(COMMAND "${READELF}" -W ${ARGN} "${FILE}" OUTPUT_VARIABLE lText RESULT_VARIABLE lResult)
  if(NOT lResult EQUAL 0)
    message(FATAL_ERROR "${READELF} ${ARGN} ${FILE} failed: ${lResult}")
  endif()
  set(${aOut} "${lText}" PARENT_SCOPE)
endfunction()

read_elf(lHeader -h)
read_elf(lSegments -l)
read_elf(lDynamic -d)
read_elf(lSymbols --dyn-syms)

# Has NAME where the pattern is found in the text.
macro(has_property_if_found aName aText aPattern)
  if("${aText}" MATCHES "${aPattern}")
    list(APPEND lHad ${aName})
  endif()
endmacro()

set(lHad "")
if("${lHeader}" MATCHES "Type: +DYN")
  list(APPEND lHad pie)
endif()
has_property_if_found(relro "${lSegments}" "GNU_RELRO")
has_property_if_found(bind-now "${lDynamic}" "\\(FLAGS[_1]*\\)[^\n]*NOW")
has_property_if_found(noexecstack "${lSegments}" "GNU_STACK[ 0-9a-fx]+RW  ")
if(NOT "${lDynamic}" MATCHES "TEXTREL")
  list(APPEND lHad no-textrel)
endif()
has_property_if_found(stack-protector "${lSymbols}" " __stack_chk_fail(@|\n)")
string(REPLACE "__stack_chk_fail" "" lOtherSymbols "${lSymbols}")
has_property_if_found(fortify "${lOtherSymbols}" " __[a-z0-9_]+_chk(@|\n)")

string(REPLACE "," ";" lWanted "${PROPERTIES}")
if(NOT lWanted)
  message(FATAL_ERROR "no properties to look for")
endif()
set(lMissing "")
foreach(lProperty IN LISTS lWanted)
  if(NOT lProperty IN_LIST lHad)
    list(APPEND lMissing ${lProperty})
  endif()
endforeach()
string(REPLACE ";" "," lMissing "${lMissing}")
if(NOT "${lMissing}" STREQUAL "${MISSING}")
  message(FATAL_ERROR "${FILE}: lacks [${lMissing}], expected to lack [${MISSING}]")
endif()
message(STATUS "${FILE}: lacks [${lMissing}] of [${PROPERTIES}]")
