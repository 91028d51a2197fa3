# Interface target with the warnings, and with the sanitizers when asked for, that everything here is built with.
add_library(tov_warnings INTERFACE)
target_compile_options(
    tov_warnings
    INTERFACE $<$<CXX_COMPILER_ID:GNU,Clang,AppleClang>:-Wall
              -Wextra
              -Wpedantic
              -Wshadow
              -Wconversion>
              $<$<AND:$<BOOL:${TOV_WERROR}>,$<CXX_COMPILER_ID:GNU,Clang,AppleClang>>:-Werror>)
if(TOV_SANITIZE)
    target_compile_options(tov_warnings INTERFACE -fsanitize=${TOV_SANITIZE} -fno-sanitize-recover=all
                                                  -fno-omit-frame-pointer
                                                  # g++ 12 misfires inside <regex> once it is instrumented.
                                                  $<$<CXX_COMPILER_ID:GNU>:-Wno-maybe-uninitialized>)
    target_link_options(tov_warnings INTERFACE -fsanitize=${TOV_SANITIZE})
    # The library needs the C++ part of the run time, which clang links into C++ programs only.
    set(c_with_clang LINK_LANG_AND_ID:C,Clang,AppleClang)
    target_link_options(tov_warnings INTERFACE $<$<${c_with_clang}>:-fsanitize-link-c++-runtime>)
    target_link_libraries(tov_warnings INTERFACE $<$<${c_with_clang}>:stdc++>)
endif()
