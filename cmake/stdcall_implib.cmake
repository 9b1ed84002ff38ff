# Rebuilds the import library of a 32-bit DLL linked with --kill-at. The DLL
# exports plain names (grdFileRead), but a caller compiled against the headers
# refers to the __stdcall name _grdFileRead@12; the import library that ld
# writes for such a DLL knows only the plain names. dlltool -k makes one whose
# decorated symbols import the plain names, from the module-definition file
# the linker wrote (lines "name = name@bytes @ordinal"; cdecl functions, the
# variadic trace functions, appear as "name @ordinal").
#   cmake -DDEF=x.def -DDLL=x.dll -DLIB=x.lib -DDLLTOOL=... -P stdcall_implib.cmake
file(STRINGS ${DEF} lines)
set(out "LIBRARY ${DLL}\nEXPORTS\n")
foreach(line IN LISTS lines)
  if(line MATCHES "^[ \t]+[A-Za-z_][A-Za-z0-9_]* = ([A-Za-z_][A-Za-z0-9_]*@[0-9]+)")
    string(APPEND out "    ${CMAKE_MATCH_1}\n")
  elseif(line MATCHES "^[ \t]+([A-Za-z_][A-Za-z0-9_]*)( |$)")
    string(APPEND out "    ${CMAKE_MATCH_1}\n")
  endif()
endforeach()
file(WRITE ${DEF}.decorated "${out}")
execute_process(COMMAND ${DLLTOOL} -k -d ${DEF}.decorated -D ${DLL} -l ${LIB} RESULT_VARIABLE failed)
if(failed)
  message(FATAL_ERROR "${DLLTOOL} could not write ${LIB}")
endif()
