#include "run/run_model.h"

#include <gtest/gtest.h>

namespace mirevo {
namespace {

TEST(RunModel, SetupsOfOneNameDoNotMeetInASharedProcessFolder) {
  RunConfig config;
  config.setupFolder = "/a";
  config.setupName = "basin";
  EXPECT_EQ(launcherSettings(config, 4).processFolderPrefix, "/a/basin_Process");
  config.processFolder = "/scratch";
  const std::string first = launcherSettings(config, 4).processFolderPrefix;
  EXPECT_TRUE(first.starts_with("/scratch/basin-") && first.ends_with("_Process")) << first;
  config.setupFolder = "/b";
  EXPECT_NE(launcherSettings(config, 4).processFolderPrefix, first);
}

TEST(RunModel, AnOutputMeasureFileThatNoMeasureReadsIsNotTheModels) {
  RunConfig config;
  config.measureFile = "/a/measures.txt";
  config.measures.resize(1);
  EXPECT_EQ(describeModel(config).measureFile, "");
  config.measures[0].interfaceType = InterfaceType::measureFile;
  EXPECT_EQ(describeModel(config).measureFile, config.measureFile);
}

}  // namespace
}  // namespace mirevo
