# tuvo_soname(<variable> <library file>): the name under which programs load the library, as the file
# itself tells it. It differs from one system to the next, so no source file may guess it.
function(tuvo_soname variable file)
  execute_process(
    COMMAND "${CMAKE_OBJDUMP}" -p "${file}"
    OUTPUT_VARIABLE headers
    ERROR_VARIABLE complaint
    RESULT_VARIABLE result)
  if(NOT result EQUAL 0 OR NOT headers MATCHES "SONAME +([^ \n]+)")
    message(FATAL_ERROR "${file} is no shared library with a SONAME: ${complaint}")
  endif()
  set(${variable} "${CMAKE_MATCH_1}" PARENT_SCOPE)
endfunction()
