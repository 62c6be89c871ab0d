#include "foundation/staged_files.h"

#include <filesystem>
#include <fstream>

#include <gtest/gtest.h>

#include "support/file_bytes.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;
using test::FileBytes;

/// A raster with a file beside it, and what a library does to such files.
struct Scene {
  Scene() {
    std::ofstream(raster) << "raster";
    std::ofstream(levels) << "old levels";
    std::ofstream(mask) << "old mask";
  }
  std::size_t CountFiles() const {
    return static_cast<std::size_t>(
        std::distance(fs::directory_iterator(folder.Path()), fs::directory_iterator()));
  }
  /// Adds to the levels, makes a new file and removes the mask.
  void Change(StagedFiles& staged) const {
    std::ofstream(staged.Stage(levels, false), std::ios::app) << " and new ones";
    std::ofstream(staged.Stage(side, true)) << "new";
    EXPECT_TRUE(staged.Remove(mask));
    // The library sees its own changes, everybody else what was there.
    EXPECT_EQ(FileBytes(staged.PlaceOf(levels)), "old levels and new ones");
    EXPECT_FALSE(fs::exists(staged.PlaceOf(mask)));
    ExpectOld();
  }
  void ExpectOld() const {
    EXPECT_EQ(FileBytes(levels), "old levels");
    EXPECT_EQ(FileBytes(mask), "old mask");
    EXPECT_FALSE(fs::exists(side));
  }

  test::TemporaryDirectory folder;
  const std::string raster = (folder.Path() / "scene").string();
  const std::string levels = raster + ".ovr", mask = raster + ".msk", side = raster + ".aux.xml";
};

TEST(StagedFiles, MoveInTogetherOrNotAtAll) {
  const Scene scene;
  {
    StagedFiles staged(scene.raster);
    EXPECT_EQ(StagedFiles::OfThread(), &staged);
    EXPECT_FALSE(staged.Covers(scene.raster));
    EXPECT_FALSE(staged.Covers(scene.raster + "2.ovr"));
    EXPECT_EQ(staged.Stage(scene.raster + ".none", false), "");
    scene.Change(staged);
  }
  EXPECT_EQ(StagedFiles::OfThread(), nullptr);
  scene.ExpectOld();
  EXPECT_EQ(scene.CountFiles(), 3U);

  StagedFiles staged(scene.raster);
  scene.Change(staged);
  std::string fault;
  ASSERT_TRUE(staged.MoveIn(fault)) << fault;
  EXPECT_EQ(FileBytes(scene.levels), "old levels and new ones");
  EXPECT_EQ(FileBytes(scene.side), "new");
  EXPECT_FALSE(fs::exists(scene.mask));
  EXPECT_EQ(scene.CountFiles(), 3U);
}

TEST(StagedFiles, WhatSomebodyElseHasChangedMeanwhileStays) {
  for (const char* const name : {".ovr", ".msk", ".aux.xml"}) {
    const Scene scene;
    std::string fault;
    {
      StagedFiles staged(scene.raster);
      scene.Change(staged);
      std::ofstream(scene.raster + name) << "somebody else's";
      EXPECT_FALSE(staged.MoveIn(fault));
    }
    EXPECT_EQ(fault, scene.raster + name + ": was changed by another program meanwhile");
    EXPECT_EQ(FileBytes(scene.raster + name), "somebody else's");
    EXPECT_EQ(scene.CountFiles(), std::string(name) == ".aux.xml" ? 4U : 3U);
  }
}

}  // namespace
}  // namespace lumo
