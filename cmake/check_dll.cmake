# What a panel's loader and its configuration tool see in xtok.dll, read
# without running it: exactly one export, GetInterfaceFactory, undecorated;
# imports from the system's own DLLs only; one description block.
#   cmake -DOBJDUMP=... -DDLL=... -P check_dll.cmake
execute_process(COMMAND ${OBJDUMP} -p ${DLL} OUTPUT_VARIABLE table RESULT_VARIABLE failed)
if(failed)
    message(FATAL_ERROR "${OBJDUMP} cannot read ${DLL}")
endif()
message("${table}")

string(REGEX MATCH "\\[Ordinal/Name Pointer\\] Table\n([^\n]+\n)*" names "${table}")
string(REGEX MATCHALL "\\[ *[0-9]+\\] [^\n]+" exports "${names}")
if(NOT exports MATCHES "^\\[ +0\\] GetInterfaceFactory$")
    message(FATAL_ERROR "exports are \"${exports}\", not GetInterfaceFactory alone")
endif()

string(REGEX MATCHALL "DLL Name: [^\n]+" imports "${table}")
foreach(import IN LISTS imports)
    string(REPLACE "DLL Name: " "" name "${import}")
    string(TOLOWER "${name}" name)
    if(NOT name MATCHES "^(kernel32|msvcrt|user32|advapi32|ntdll)\\.dll$")
        message(FATAL_ERROR "${DLL} needs ${name}, which a panel does not have")
    endif()
endforeach()

file(STRINGS ${DLL} headers REGEX "<<ICOM_XML_START>>")
list(LENGTH headers count)
if(NOT count EQUAL 1)
    message(FATAL_ERROR "${count} description blocks in ${DLL}, not one")
endif()
message("exports: ${exports}; imports: ${imports}; one description block")
