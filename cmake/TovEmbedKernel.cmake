# tov_embed_kernel(<target> <Name> <file>...): adds to the target a source that defines the constant k<Name>Source, the
# texts of the files joined in order. It is written at build time by CMake alone, whenever a file changes.
function(tov_embed_kernel target name)
    set(inputs)
    foreach(file IN LISTS ARGN)
        list(APPEND inputs ${CMAKE_CURRENT_SOURCE_DIR}/${file})
    endforeach()
    set(output ${CMAKE_CURRENT_BINARY_DIR}/${name}Source.cpp)
    set(script ${CMAKE_SOURCE_DIR}/cmake/EmbedKernel.cmake)
    add_custom_command(
        OUTPUT ${output}
        COMMAND ${CMAKE_COMMAND} -DNAME=${name} "-DINPUTS=${inputs}" -DOUTPUT=${output} -P ${script}
        DEPENDS ${inputs} ${script}
        COMMENT "Embedding ${name}"
        VERBATIM)
    target_sources(${target} PRIVATE ${output})
endfunction()
