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
endif()
