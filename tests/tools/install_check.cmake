# Run by ctest: install the build into a scratch prefix, build the consumer
# against it, run the consumer and the installed xtok-host.
function(step)
    execute_process(COMMAND ${ARGV} RESULT_VARIABLE failed OUTPUT_VARIABLE out ERROR_VARIABLE out)
    if(failed)
        message(FATAL_ERROR "${ARGV}\n${out}")
    endif()
    set(out "${out}" PARENT_SCOPE)
endfunction()

file(REMOVE_RECURSE ${WORK_DIR})
set(prefix ${WORK_DIR}/prefix)
step(${CMAKE_COMMAND} --install ${BUILD_DIR} --prefix ${prefix})
step(${CMAKE_COMMAND} -S ${CONSUMER_DIR} -B ${WORK_DIR}/build -G ${GENERATOR}
    -DCMAKE_PREFIX_PATH=${prefix})
step(${CMAKE_COMMAND} --build ${WORK_DIR}/build)
# A plug-in built with sanitizers loads only into a program that has them.
if(NOT SANITIZE)
    step(${WORK_DIR}/build/consumer)
    if(NOT out MATCHES "ProtFactoryInDLL")
        message(FATAL_ERROR "the consumer said: ${out}")
    endif()
endif()
# The installed command finds the installed plug-in by itself.
step(${prefix}/bin/xtok-host describe)
if(NOT out MATCHES "Memory types \\(19\\)")
    message(FATAL_ERROR "the installed xtok-host said: ${out}")
endif()
file(REMOVE_RECURSE ${WORK_DIR})
