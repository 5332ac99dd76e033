# Run with `cmake -D NPM=... -D SOURCE=... -D FOLDER=... -P`: installs what SOURCE/package-lock.json pins into FOLDER/node_modules, with
# npm's own client. FOLDER is shared by all presets: builds at the same time wait for each other, and one whose lock file
# is installed already does nothing.
file(MAKE_DIRECTORY ${FOLDER})
file(LOCK ${FOLDER} DIRECTORY GUARD PROCESS TIMEOUT 600)

file(SHA256 ${SOURCE}/package-lock.json wanted)
set(installed "")
if(EXISTS ${FOLDER}/installed)
  file(READ ${FOLDER}/installed installed)
endif()
if(installed STREQUAL wanted)
  return()
endif()

message(STATUS "Installing the report page's npm packages into ${FOLDER}")
file(REMOVE ${FOLDER}/installed)
file(COPY ${SOURCE}/package.json ${SOURCE}/package-lock.json DESTINATION ${FOLDER})
execute_process(
  COMMAND ${NPM} ci --ignore-scripts --no-audit --no-fund --loglevel=error
  WORKING_DIRECTORY ${FOLDER}
  RESULT_VARIABLE result)
if(NOT result EQUAL 0)
  message(FATAL_ERROR "npm ci failed in ${FOLDER}: ${result}")
endif()
file(WRITE ${FOLDER}/installed ${wanted})
