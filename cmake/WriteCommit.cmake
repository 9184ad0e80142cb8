# cmake -DFOLDER=SOURCES -DOUT=FILE.cpp -P WriteCommit.cmake: the commit that is built; touches the file only when it is another one.
# Sources that "git archive" wrote have no repository; their commit stands in a file.
file(STRINGS ${CMAKE_CURRENT_LIST_DIR}/commit.txt commit)
if(commit MATCHES "^.Format")
    set(commit "")
endif()
find_program(GIT git)
if(GIT AND EXISTS ${FOLDER}/.git)
    execute_process(COMMAND ${GIT} -C ${FOLDER} describe --always --dirty=+ --exclude=*
        OUTPUT_VARIABLE commit OUTPUT_STRIP_TRAILING_WHITESPACE ERROR_QUIET)
endif()
set(text "#include \"programs/base/commit.h\"\n\nnamespace Base {\n\nchar const* const COMMIT = \"${commit}\";\n\n} // namespace Base\n")
set(before "")
if(EXISTS ${OUT})
    file(READ ${OUT} before)
endif()
if(NOT text STREQUAL before)
    file(WRITE ${OUT} "${text}")
endif()
