# The engine is not staged: headwater/install installs it and runs the model once, which the setup needs.
set(stage ${CMAKE_CURRENT_BINARY_DIR}/headwater)
set(staged)
set(simulated)
foreach(file headwater.kdx install data/headwater_daily.csv data/PROVENANCE.md model/run.sh model/topmodel.tpl
        model/topmodel.txt model/grass/PERMANENT/DEFAULT_WIND model/grass/PERMANENT/WIND)
  stage_file(${CMAKE_CURRENT_LIST_DIR}/${file} ${stage}/${file})
endforeach()

set(series ${stage}/model/weather.txt ${stage}/model/days.txt ${stage}/model/topidx.txt ${stage}/data/discharge.csv)
add_custom_command(OUTPUT ${series}
  DEPENDS ${CMAKE_CURRENT_LIST_DIR}/prepare-data ${stage}/data/headwater_daily.csv
  COMMAND ${CMAKE_CURRENT_LIST_DIR}/prepare-data ${stage}
  VERBATIM)

add_custom_target(example_headwater ALL DEPENDS ${staged} ${series})
install_example(headwater)
