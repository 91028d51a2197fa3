# Writes OUTPUT, a C++ source with the constant k<NAME>Source: the texts of INPUTS joined in order.
# String literals have a length limit in some compilers, so every line becomes a literal of its own.
set(text "")
foreach(input IN LISTS INPUTS)
    file(READ ${input} part)
    string(APPEND text "${part}")
endforeach()
string(REPLACE "\\" "\\\\" text "${text}")
string(REPLACE "\"" "\\\"" text "${text}")
string(REPLACE "\n" "\\n\"\n    \"" text "${text}")
file(WRITE ${OUTPUT} "// Generated from the files of Impl/CL; changes are lost.\n"
     "extern const char k${NAME}Source[];\n" "const char k${NAME}Source[] =\n    \"${text}\";\n")
