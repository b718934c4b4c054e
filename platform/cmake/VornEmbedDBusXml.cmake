# cmake -DINPUT=<xml> -DOUTPUT=<cpp> -DSYMBOL=<[ns::]name> -P VornEmbedDBusXml.cmake
# Writes <cpp> defining `const char <name>[]` with the text of <xml> as a raw string literal.
file(READ "${INPUT}" text)
set(delim "VORNDBUSXML")
string(FIND "${text}" ")${delim}\"" clash)
if(NOT clash EQUAL -1)
  message(FATAL_ERROR "${INPUT} contains the raw string delimiter )${delim}\"")
endif()

string(REPLACE "::" ";" parts "${SYMBOL}")
list(POP_BACK parts name)
set(open "")
set(close "")
foreach(ns IN LISTS parts)
  string(APPEND open "namespace ${ns} {\n")
  string(PREPEND close "}  // namespace ${ns}\n")
endforeach()

set(content "// Generated from ${INPUT}: do not edit.\n${open}")
string(APPEND content "extern const char ${name}[];\n")
string(APPEND content "const char ${name}[] = R\"${delim}(${text})${delim}\";\n${close}")
file(WRITE "${OUTPUT}" "${content}")
