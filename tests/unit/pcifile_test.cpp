#include "sources/pcifile.h"

#include <gtest/gtest.h>
#include <sys/stat.h>
#include <unistd.h>

#include <cstring>
#include <string>

#include "adapters/linvpd.h"
#include "scratchdir.h"

namespace {

class FindPciFileTest : public ::testing::Test {
  protected:
    void SetUp() override { SetModel("1234ABC"); }
    void TearDown() override {
        ValidVPD = false;
        std::memset(&Vpd, 0, sizeof(Vpd));
    }
    static void SetModel(const char (&typeModel)[8]) {
        std::memcpy(Vpd.MachineTypeModel, typeModel, 7);
        ValidVPD = true;
    }
    static std::string Found() {
        const char* name = FindPciFile();
        return name == nullptr ? "(null)" : name;
    }

    InstallTree Tree;
};

TEST_F(FindPciFileTest, TypeAndModelBeatTypeAlone) {
    Tree.Scratch().Write("inst/1234ABC.pci", "");
    Tree.Scratch().Write("inst/1234.pci", "");
    EXPECT_EQ(Found(), "1234ABC.pci");
    ASSERT_EQ(unlink(Tree.InstFile("1234ABC.pci").c_str()), 0);
    EXPECT_EQ(Found(), "1234.pci");
    ASSERT_EQ(unlink(Tree.InstFile("1234.pci").c_str()), 0);
    EXPECT_EQ(Found(), "(null)");
    // Files of another machine or outside the install directory do not count.
    Tree.Scratch().Write("inst/1235.pci", "");
    Tree.Scratch().Write("1234ABC.pci", "");
    EXPECT_EQ(Found(), "(null)");
}

TEST_F(FindPciFileTest, NoValidVitalProductDataMeansNoFile) {
    Tree.Scratch().Write("inst/1234ABC.pci", "");
    ValidVPD = false;
    EXPECT_EQ(FindPciFile(), nullptr);
}

TEST_F(FindPciFileTest, TheNameIsTakenAsTheFirmwareWroteIt) {
    // Trailing blanks stay in the name.
    SetModel("1234AB ");
    Tree.Scratch().Write("inst/1234AB.pci", "");
    EXPECT_EQ(Found(), "(null)");
    Tree.Scratch().Write("inst/1234AB .pci", "");
    EXPECT_EQ(Found(), "1234AB .pci");

    // A zero byte ends the name early.
    SetModel("98\0\0XYZ");
    Tree.Scratch().Write("inst/98.pci", "");
    EXPECT_EQ(Found(), "98.pci");

    // Names that are empty or hold a slash name no file in the install directory.
    SetModel("\0\0\0\0\0\0\0");
    Tree.Scratch().Write("inst/.pci", "");
    EXPECT_EQ(Found(), "(null)");
    SetModel("../xABC");
    Tree.Scratch().Write("xABC.pci", "");
    Tree.Scratch().Write("x.pci", "");
    EXPECT_EQ(Found(), "(null)");
}

}  // namespace
