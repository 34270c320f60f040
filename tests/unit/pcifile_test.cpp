#include "sources/pcifile.h"

#include <gtest/gtest.h>
#include <unistd.h>

#include <cstring>
#include <string>

#include "adapters/linvpd.h"
#include "scratchdir.h"

TEST(FindPciFile, TypeAndModelBeatTypeAloneAndTheNameIsTakenAsTheFirmwareWroteIt) {
    InstallTree tree;
    for (const char* name :
         {"inst/1234ABC.pci", "inst/1234.pci", "inst/1235.pci", "1234ABC.pci", "inst/1234AB.pci",
          "inst/1234AB .pci", "inst/98.pci", "inst/.pci", "xABC.pci", "x.pci"}) {
        tree.Scratch().Write(name, "");
    }
    // Type and model, its file removed, then the type's file removed. Trailing blanks stay in
    // the name, a zero byte ends it early, and an empty name or one with a slash names nothing.
    const std::pair<const char*, const char*> cases[] = {
        {"1234ABC", "1234ABC.pci"}, {"-", "1234.pci"},       {"-", nullptr},
        {"1234AB ", "1234AB .pci"}, {"98\0\0XYZ", "98.pci"}, {"\0\0\0\0\0\0\0", nullptr},
        {"../xABC", nullptr},
    };
    for (const auto& [model, file] : cases) {
        if (*model == '-') {
            const char* found = FindPciFile();
            ASSERT_NE(found, nullptr);
            ASSERT_EQ(unlink(tree.InstFile(found).c_str()), 0);
        } else {
            std::memcpy(Vpd.MachineTypeModel, model, 7);
            ValidVPD = true;
        }
        const char* found = FindPciFile();
        EXPECT_STREQ(found, file) << model;
    }
    // Without valid vital product data there is no file.
    std::memcpy(Vpd.MachineTypeModel, "1234AB ", 7);
    ValidVPD = false;
    EXPECT_EQ(FindPciFile(), nullptr);
    std::memset(&Vpd, 0, sizeof(Vpd));
}
