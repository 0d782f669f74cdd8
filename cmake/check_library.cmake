# What a panel's loader and its configuration tool see in the plug-in file,
# read without running it: exactly one export, GetInterfaceFactory,
# undecorated; for a DLL, imports from the system's own DLLs only; one
# description block.
#   cmake -DOBJDUMP=... -DLIBRARY=... -P check_library.cmake
if(LIBRARY MATCHES "\\.dll$")
    set(dump -p)
else()
    set(dump -T)
endif()
execute_process(COMMAND ${OBJDUMP} ${dump} ${LIBRARY} OUTPUT_VARIABLE table RESULT_VARIABLE failed)
if(failed)
    message(FATAL_ERROR "${OBJDUMP} cannot read ${LIBRARY}")
endif()
message("${table}")

if(dump STREQUAL "-p")
    string(REGEX MATCH "\\[Ordinal/Name Pointer\\] Table\n([^\n]+\n)*" names "${table}")
    string(REGEX MATCHALL "\\[ *[0-9]+\\] [^\n]+" exports "${names}")
    string(REGEX REPLACE "\\[ *[0-9]+\\] " "" exports "${exports}")
else()
    # Global symbols that the file defines (local section symbols and the
    # undefined ones it imports are no exports).
    string(REGEX MATCHALL "\n[0-9a-f]+ g [^\n]+" defined "${table}")
    set(exports "")
    foreach(line IN LISTS defined)
        if(NOT line MATCHES "\\*UND\\*")
            string(REGEX REPLACE ".*[ \t]" "" name "${line}")
            list(APPEND exports "${name}")
        endif()
    endforeach()
endif()
if(NOT exports STREQUAL "GetInterfaceFactory")
    message(FATAL_ERROR "exports are \"${exports}\", not GetInterfaceFactory alone")
endif()

string(REGEX MATCHALL "DLL Name: [^\n]+" imports "${table}")
foreach(import IN LISTS imports)
    string(REPLACE "DLL Name: " "" name "${import}")
    string(TOLOWER "${name}" name)
    if(NOT name MATCHES "^(kernel32|msvcrt|user32|advapi32|ntdll)\\.dll$")
        message(FATAL_ERROR "${LIBRARY} needs ${name}, which a panel does not have")
    endif()
endforeach()

file(STRINGS ${LIBRARY} headers REGEX "<<ICOM_XML_START>>")
list(LENGTH headers count)
if(NOT count EQUAL 1)
    message(FATAL_ERROR "${count} description blocks in ${LIBRARY}, not one")
endif()
message("exports: ${exports}; imports: ${imports}; one description block")
