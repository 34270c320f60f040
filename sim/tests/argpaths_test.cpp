// Relative paths in the command's arguments.
#include <gtest/gtest.h>

#include "sim/launcher/argpaths.h"
#include "sim/tests/simrun.h"

namespace velhsim::test {
namespace {

TEST(ArgumentPaths, MakesPathsFromTheStartingFolderAbsolute) {
    const ScratchDir dir;
    dir.Write("origin/build/agent.jar", "");
    dir.Write("origin/lib/a.jar", "");
    dir.Write("origin/shared", "");
    dir.Write("install/shared", "");
    const std::string origin = dir / "origin";
    const std::vector<std::string> resolved = ResolveArguments(
        {"java", "-Djava.library.path=build", "-cp", "build/agent.jar:lib/a.jar:missing.jar",
         "--json", "shared", "/abs/build", "com.example.Main", "build", "-Dx="},
        origin, dir / "install");
    const std::vector<std::string> expected = {
        "java",
        "-Djava.library.path=" + origin + "/build",
        "-cp",
        origin + "/build/agent.jar:" + origin + "/lib/a.jar:missing.jar",
        "--json",
        "shared",  // the install folder has one too, so the install folder's is meant
        "/abs/build",
        "com.example.Main",
        origin + "/build",
        "-Dx="};
    EXPECT_EQ(resolved, expected);

    // A command given with a folder is resolved too; one without is left to PATH.
    dir.Write("origin/tools/run", "");
    dir.Write("origin/build2", "");
    EXPECT_EQ(ResolveArguments({"tools/run"}, origin, dir / "install")[0], origin + "/tools/run");
    EXPECT_EQ(ResolveArguments({"build2"}, origin, dir / "install")[0], "build2");
}

}  // namespace
}  // namespace velhsim::test
