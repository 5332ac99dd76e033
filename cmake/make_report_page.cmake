# Run with `cmake -D NODE=... -D NPM=... -D SOURCE=... -D FOLDER=... -D TEMPLATE=... -P`: makes TEMPLATE, the page in
# SOURCE bundled with the packages that SOURCE/package-lock.json pins. FOLDER is shared by all presets. It keeps the
# packages, in node_modules, and the last page, which is used again if the content is the same. Simultaneous builds wait
# for each other.
file(MAKE_DIRECTORY ${FOLDER})
file(LOCK ${FOLDER} DIRECTORY GUARD PROCESS TIMEOUT 600)

# Sets `result` to whether the file `stamp` contains `content`.
function(is_stamped stamp content result)
  set(${result} FALSE PARENT_SCOPE)
  if(EXISTS ${stamp})
    file(READ ${stamp} found)
    if(found STREQUAL content)
      set(${result} TRUE PARENT_SCOPE)
    endif()
  endif()
endfunction()

file(SHA256 ${SOURCE}/package-lock.json lock)
is_stamped(${FOLDER}/installed ${lock} is_installed)
if(NOT is_installed)
  message(STATUS "Installing the report page's npm packages into ${FOLDER}")
  file(REMOVE ${FOLDER}/installed ${FOLDER}/bundled)
  file(COPY ${SOURCE}/package.json ${SOURCE}/package-lock.json DESTINATION ${FOLDER})
  execute_process(
    COMMAND ${NPM} ci --ignore-scripts --no-audit --no-fund --loglevel=error
    WORKING_DIRECTORY ${FOLDER}
    COMMAND_ERROR_IS_FATAL ANY)
  file(WRITE ${FOLDER}/installed ${lock})
endif()

file(GLOB_RECURSE files RELATIVE ${SOURCE} ${SOURCE}/*.ts ${SOURCE}/*.css ${SOURCE}/*.html ${SOURCE}/*.mjs ${SOURCE}/*.json)
set(content "")
foreach(file IN LISTS files)
  file(SHA256 ${SOURCE}/${file} hash)
  string(APPEND content "${hash} ${file}\n")
endforeach()
is_stamped(${FOLDER}/bundled "${content}" is_bundled)
if(NOT is_bundled)
  message(STATUS "Bundling the report's page")
  file(REMOVE ${FOLDER}/bundled)
  execute_process(
    COMMAND ${NODE} ${SOURCE}/bundle.mjs ${FOLDER}/node_modules ${FOLDER}/report_template.html
    COMMAND_ERROR_IS_FATAL ANY)
  file(WRITE ${FOLDER}/bundled "${content}")
endif()

get_filename_component(destination ${TEMPLATE} DIRECTORY)
file(COPY ${FOLDER}/report_template.html DESTINATION ${destination})
file(TOUCH ${TEMPLATE})
