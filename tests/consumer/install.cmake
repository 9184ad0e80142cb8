# Installs the library, without the programs, afresh: what an earlier version left behind must not help.
file(REMOVE_RECURSE ${PREFIX})
foreach(component runtime development)
    execute_process(
        COMMAND ${CMAKE_COMMAND} --install ${BUILD} --prefix ${PREFIX} --component ${component}
        COMMAND_ERROR_IS_FATAL ANY)
endforeach()
