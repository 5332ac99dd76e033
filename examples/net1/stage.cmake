# The engine is not staged: net1/install fetches it and runs the model once, which the setup needs.
set(stage ${CMAKE_CURRENT_BINARY_DIR}/net1)
set(staged)
set(series)
set(simulated)
foreach(file net1.kdx install prepare-data package.json package-lock.json data/pressures.csv data/PROVENANCE.md model/run.mjs
        model/net1.tpl model/net1.inp)
  stage_file(${CMAKE_CURRENT_LIST_DIR}/${file} ${stage}/${file})
endforeach()

add_custom_target(example_net1 ALL DEPENDS ${staged})
install_example(net1)
