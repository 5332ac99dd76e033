set(stage ${CMAKE_CURRENT_BINARY_DIR}/sitter)
set(staged)
foreach(file sitter.kdx two-gauges.kdx data/sitter_daily.csv data/PROVENANCE.md model/run.sh model/upper.tpl model/upper.txt model/lower.tpl
        model/lower.txt model/river.tpl model/river.txt)
  stage_file(${CMAKE_CURRENT_LIST_DIR}/${file} ${stage}/${file})
endforeach()
foreach(program gr4j_cemaneige muskingum)
  stage_file($<TARGET_FILE:${program}> ${stage}/model/${program})
endforeach()

set(series ${stage}/model/upper_forcing.csv ${stage}/model/lower_forcing.csv ${stage}/data/discharge.csv)
add_custom_command(OUTPUT ${series}
  DEPENDS ${CMAKE_CURRENT_LIST_DIR}/prepare-data ${stage}/data/sitter_daily.csv
  COMMAND ${CMAKE_CURRENT_LIST_DIR}/prepare-data ${stage}
  VERBATIM)

set(simulated ${stage}/model/upper.csv ${stage}/model/st_gallen.csv)
add_custom_command(OUTPUT ${simulated}
  DEPENDS ${staged} ${series}
  COMMAND ./run.sh
  WORKING_DIRECTORY ${stage}/model
  VERBATIM)

add_custom_target(example_sitter ALL DEPENDS ${staged} ${series} ${simulated})
install_example(sitter)
