# The dynamic symbol table of LIBRARY defines exactly the functions that the header HEADER declares, the one with a C++
# symbol under that; its name and its needs are as they should be. NM and READELF are the tools.
file(READ ${HEADER} header)
string(REGEX MATCHALL "TOV_API int(32_t)? tov[A-Za-z0-9]+" declarations "${header}")
set(expected)
foreach(declaration IN LISTS declarations)
    string(REGEX REPLACE ".* " "" name "${declaration}")
    string(REPLACE "tovContextCreateImageFromOpenGlTexture" "_Z38tovContextCreateImageFromOpenGlTexturePvjijPS_" name
                   "${name}")
    list(APPEND expected ${name})
endforeach()
execute_process(COMMAND ${NM} -D --defined-only --format=posix ${LIBRARY} OUTPUT_VARIABLE table COMMAND_ERROR_IS_FATAL
                                                                                                ANY)
string(REGEX REPLACE " [^\n]*\n" ";" exported "${table}")
list(REMOVE_ITEM exported "")
list(SORT expected)
list(SORT exported)
if(NOT exported STREQUAL expected)
    message(FATAL_ERROR "exported: ${exported}\nexpected: ${expected}")
endif()

execute_process(COMMAND ${READELF} -dW ${LIBRARY} OUTPUT_VARIABLE dynamic COMMAND_ERROR_IS_FATAL ANY)
if(NOT dynamic MATCHES "SONAME[^\n]*\\[libtov\\.so\\.1\\]")
    message(FATAL_ERROR "the SONAME is not libtov.so.1:\n${dynamic}")
endif()
if(dynamic MATCHES "NEEDED[^\n]*(OpenCL|libGL)")
    message(FATAL_ERROR "OpenCL and OpenGL are opened at run time, not linked:\n${dynamic}")
endif()
