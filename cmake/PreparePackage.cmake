# Run on the files of the package before they are packed.
set(share ${CPACK_TEMPORARY_DIRECTORY}/usr/share)
set(documents ${share}/doc/zeb)

file(COPY_FILE ${CPACK_ZEB_CHANGELOG} ${documents}/changelog)

# The programs contain code of these libraries, which are headers only; their licences want to be
# where the code is.
foreach(library libcli11-dev nlohmann-json3-dev libeigen3-dev)
  if(EXISTS /usr/share/doc/${library}/copyright)
    file(READ /usr/share/doc/${library}/copyright text)
    file(APPEND ${documents}/copyright "\n\nOf ${library}, parts of which are in the programs:\n\n${text}")
  endif()
endforeach()

# Without names and dates in them, so that the same files make the same package.
file(GLOB manuals ${share}/man/man*/*.[0-9])
execute_process(COMMAND gzip -9n ${manuals} ${documents}/changelog COMMAND_ERROR_IS_FATAL ANY)
