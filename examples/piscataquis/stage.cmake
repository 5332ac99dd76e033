set(stage ${CMAKE_CURRENT_BINARY_DIR}/piscataquis)
set(staged)
foreach(file piscataquis.kdx glm.kdx sensitivity.kdx morris.kdx sobol.kdx uncertainty.kdx glue.kdx dream.kdx scenarios.kdx data/piscataquis_daily.csv data/PROVENANCE.md model/run.sh model/parameters.tpl
        model/parameters.txt)
  stage_file(${CMAKE_CURRENT_LIST_DIR}/${file} ${stage}/${file})
endforeach()
stage_file($<TARGET_FILE:gr4j_cemaneige> ${stage}/model/gr4j_cemaneige)

set(series ${stage}/model/forcing.csv ${stage}/data/discharge.csv ${stage}/data/discharge_without_estimated.csv)
add_custom_command(OUTPUT ${series}
  DEPENDS ${CMAKE_CURRENT_LIST_DIR}/prepare-data ${stage}/data/piscataquis_daily.csv
  COMMAND ${CMAKE_CURRENT_LIST_DIR}/prepare-data ${stage}
  VERBATIM)

# A simulated series must exist before a run, so the model is run once with its own parameters.
set(simulated ${stage}/model/simulated.csv)
add_custom_command(OUTPUT ${simulated}
  DEPENDS ${staged} ${series}
  COMMAND ./run.sh
  WORKING_DIRECTORY ${stage}/model
  VERBATIM)

add_custom_target(example_piscataquis ALL DEPENDS ${staged} ${series} ${simulated})
install_example(piscataquis)
