# The manual for the browser, in ${PROJECT_BINARY_DIR}/site: target `site`, part of the default build where the
# generator is installed. scripts/site makes it without CMake.
execute_process(COMMAND ${PROJECT_SOURCE_DIR}/scripts/site --check RESULT_VARIABLE site_lacks OUTPUT_QUIET ERROR_QUIET)
if(site_lacks EQUAL 0 AND NOT MIREVO_SANITIZE AND NOT MIREVO_FUZZ)
  set(site_default ON)
else()
  set(site_default OFF)
endif()
option(MIREVO_SITE "Make the manual for the browser, which needs sphinx, myst-parser and furo" ${site_default})
if(MIREVO_SITE)
  file(GLOB_RECURSE site_sources CONFIGURE_DEPENDS ${PROJECT_SOURCE_DIR}/docs/* ${PROJECT_SOURCE_DIR}/examples/*.md)
  add_custom_command(OUTPUT ${PROJECT_BINARY_DIR}/site/index.html
    COMMAND ${PROJECT_SOURCE_DIR}/scripts/site ${PROJECT_BINARY_DIR}/site
    DEPENDS ${site_sources} ${PROJECT_SOURCE_DIR}/scripts/site ${PROJECT_SOURCE_DIR}/README.md
      ${PROJECT_SOURCE_DIR}/CHANGELOG.md ${PROJECT_SOURCE_DIR}/CONTRIBUTING.md
    COMMENT "Rendering the manual"
    VERBATIM)
  add_custom_target(site ALL DEPENDS ${PROJECT_BINARY_DIR}/site/index.html)
endif()
