#include "data/access_policy.h"

#include <filesystem>
#include <fstream>

#include "foundation/fault.h"
#include "support/temporary_directory.h"

namespace lumo {
namespace {

namespace fs = std::filesystem;

struct PolicyScope {
  explicit PolicyScope(const AccessPolicy& policy) { EXPECT_TRUE(SetAccessPolicy(policy)); }
  ~PolicyScope() { SetAccessPolicy({}); }
};

TEST(AccessPolicy, KeepsSourcesInsideTheRoots) {
  const test::TemporaryDirectory directory;
  const fs::path base(directory.Path());
  fs::create_directories(base / "in/deep");
  fs::create_directories(base / "in-not");
  fs::create_directories(base / "in/vsi_scenes");
  for (const char* name : {"in/vsi_scenes/d", "in/a", "in/deep/b", "out", "in-not/c"})
    std::ofstream(base / name) << 1;
  fs::create_symlink(base / "out", base / "in/leads-out");
  fs::create_symlink(base / "missing", base / "in/leads-nowhere");
  fs::create_directory_symlink(base / "in/deep", base / "in/leads-in");

  AccessPolicy policy;
  policy.roots = {(base / "in/../in").string()};
  policy.network = policy.virtualFiles = policy.memory = policy.indirect = false;
  const PolicyScope scope(policy);
  const auto in = [&](const char* name) { return (base / name).string(); };
  const struct {
    std::string name;
    bool making, allowed;
  } cases[] = {{in("in/a"), false, true},
               {in("in/leads-in/b"), false, true},
               {in("in/leads-in/new"), true, true},
               {in("in/new"), true, true},
               {in("in/new"), false, false},
               {in("in/leads-out"), false, false},
               {in("in/leads-out"), true, false},
               {in("in/leads-nowhere"), true, false},
               {in("in-not/c"), false, false},
               {in("in/../out"), false, false},
               {in("in/../new"), true, false},
               {"HDF5:" + in("in/a"), false, true},
               {"HDF5:\"" + in("in/a") + "\"://band", false, true},
               {"HDF5:\"" + in("out") + "\"://band", false, false},
               {"HDF5:" + in("out") + "://band", false, false},
               {"HDF5:\"" + in("in/missing") + "\"://band", false, false},
               {"file://" + in("in/a"), false, true},
               {"file:" + in("out"), false, false},
               {"file://localhost" + in("out"), false, false},
               {in("in/vsi_scenes/d"), false, true},
               {"/vsisubfile/0_10," + in("in/a"), false, false},
               {"/vsizip/" + in("in/a"), false, false},
               {"/vsicurl/http://x/y.tif", false, false},
               {"http://x/y.tif", false, false},
               {"MemoryRaster", false, false},
               {"WMS", false, false},
               {"Spot", false, false},
               {"TIFF", false, true}};
  for (const auto& c : cases) {
    SCOPED_TRACE(c.name);
    TakeFault();
    EXPECT_EQ(MayUseSource(ConnStrings({c.name}), c.making), c.allowed);
    EXPECT_EQ(TakeFault().GetLength() == 0, c.allowed);
  }
  // Behind the name stand options, and names of places inside it.
  const struct {
    std::string piece;
    bool allowed;
  } pieces[] = {{"SUBDATASET=/group/band", true},
                {"NUM_THREADS=2", true},
                {"SUBDATASET=2", true},
                {"FILE=" + in("in/a"), true},
                {"FILE=" + in("out"), false},
                {"FILE=/vsicurl/http://x", false},
                {in("out"), false}};
  for (const auto& c : pieces) {
    EXPECT_EQ(MayUseSource(ConnStrings({String(in("in/a")), String(c.piece)}), false), c.allowed)
        << c.piece;
  }
  EXPECT_TRUE(MayReachFile(in("in/missing"), true));
  EXPECT_FALSE(MayReachFile(in("in/leads-nowhere"), true));
  const OwnMemoryScope own;
  EXPECT_TRUE(MayUseSource(ConnStrings({"MemoryRaster", "any text"}), false));
}

TEST(AccessPolicy, AllowsEverythingByDefaultAndRefusesBadRoots) {
  EXPECT_TRUE(
      MayUseSource(ConnStrings({"WMS", "http://x", "/vsizip/a.zip/b", "/etc/passwd"}), false));
  AccessPolicy policy;
  policy.roots = {"/no/such/folder"};
  EXPECT_FALSE(SetAccessPolicy(policy));
  EXPECT_TRUE(GetAccessPolicy().roots.empty());
}

}  // namespace
}  // namespace lumo
