#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "adapters/moddriver.h"
#include "adapters/pciname.h"
#include "diag/hwdebug.h"
#include "tests/unit/fake_modules.h"
#include "tests/unit/scratchdir.h"
#include "util/sysaccess.h"

namespace {

// The examples among other vendors' lines: a device line with an example's ID under another
// vendor, and a line longer than a read block whose 69th 1023-byte piece looks like the vendor.
const std::string Database =
    "# comment\n0999  Other\n\tffff  Foreign Widget\n\n" + std::string(1023 * 68, 'x') +
    "1234  Not a vendor\n1234  Example Corp\n\t0001  First\n\t\t5555 0002  Under another\n"
    "\t\t\t\n\tabcd  Widget\n\t\t5555 0001  Widget Mark II\n\t\t5555 0003  Widget #3\n"
    "\tabce  Gadget\n\t\t5555 0004  Under a later device\n5678\n9000  Last\n\tabcd  Line";

struct Naming : ::testing::Test {
    void SetUp() override {
        InstallFakeModules();
        SysPaths().PciIds = Tree.Scratch().Write("pci.ids", Database);
        SysPaths().PciIdsMisc = SysPaths().PciIdsHwdata = Tree.Scratch().Path("none");
        SysPaths().SysconfigKernel = Tree.Scratch().Path("kernel");
    }
    void TearDown() override { ResetSystemAccess(); }
    AdapterDescriptor Adapter;
    bool Opened = false;
    InstallTree Tree;
};

}  // namespace

TEST_F(Naming, NamesFromTheDatabase) {
    auto name = [this](uint16_t vendor, uint16_t device, uint16_t subSystem) {
        _PCI_CONFIG0 config{};
        config.VendorID = vendor;
        config.DeviceID = device;
        config.SubSysVendorID = 0x5555;
        config.SubSystemID = subSystem;
        Opened = GetAdapterName(&Adapter, &config);
        return Adapter.Name;
    };
    struct {
        uint16_t Vendor, Device, SubSystem;
        const wchar_t* Name;
    } cases[] = {
        {0x1234, 0xabcd, 1, L"Example Corp Widget Mark II"},
        {0x1234, 0xabcd, 2, L"Example Corp Widget"},
        {0x1234, 0xffff, 1, L"Example Corp unknown device"},
        {0x9999, 0x0001, 1, L""},
        {0x1234, 0xabcd, 4, L"Example Corp Widget"},  // a later device's subsystem
        {0x9000, 0xabcd, 1, L"Last Line"},            // no line feed
    };
    for (const auto& c : cases) {
        EXPECT_EQ(name(c.Vendor, c.Device, c.SubSystem), c.Name) << c.Name;
    }
    // The system's own path missing: where current distributions keep it; nowhere: a failure.
    std::swap(SysPaths().PciIds, SysPaths().PciIdsHwdata);
    EXPECT_EQ(name(0x1234, 0xabcd, 1), L"Example Corp Widget Mark II");
    SysPaths().PciIdsHwdata = SysPaths().PciIds;
    EXPECT_EQ(name(0x1234, 0xabcd, 1), L"");
    EXPECT_FALSE(Opened);
    EXPECT_NE(Tree.Log().find("GetAdapterName():  fopen() failed (0x00000002)"), std::string::npos);
}

TEST(NamingTrim, CommentIndentAndId) {
    struct {
        char Trim;  // Comment, Indent or iD
        const char *Line, *Rest;
        unsigned Result;
    } cases[] = {
        {'C', "abc#def", "abc", 3},           {'C', "#only", "", 0},
        {'I', "\t\tx\ty", "x\ty", 2},         {'I', " \tx", " \tx", 0},
        {'D', "1234  Example", "Example", 7}, {'D', " \t12\fx y", "x y", 3},
        {'D', "5678 \t", "5678 \t", 6},
    };
    for (const auto& c : cases) {
        char line[32];
        std::strcpy(line, c.Line);
        unsigned result = c.Trim == 'C'   ? TrimComment(line, "#")
                          : c.Trim == 'I' ? static_cast<unsigned>(TrimIndent(line))
                                          : TrimID(line);
        EXPECT_EQ(result, c.Result) << c.Line;
        EXPECT_STREQ(line, c.Rest) << c.Line;
    }
}

TEST_F(Naming, ModuleNameFromTheDeviceList) {
    const std::string fields = "\t80861010\t13\tfeb00000";
    Tree.Scratch().Write("devices", "02fa" + fields + "\tno\n02fb" + fields + "\te1000\n0300" +
                                        fields + "\t\n0308e1000\n0310\tehci-pci\n0318\tlast");
    struct {
        uint32_t Bus, Device, Function;
        const char* Module;
    } cases[] = {{0x02, 0x1f, 3, "e1000"}, {0x102, 0x3f, 0xb, "e1000"}, {3, 0, 0, nullptr},
                 {3, 1, 0, nullptr},       {3, 2, 0, "ehci-pci"},       {3, 3, 0, "last"},
                 {4, 0, 0, nullptr}};
    for (const auto& c : cases) {
        Adapter.Bus = c.Bus;
        Adapter.Device = c.Device;
        Adapter.Function = c.Function;
        GetModuleName(&Adapter, Tree.Scratch().Path().c_str());
        EXPECT_STREQ(Adapter.ModuleName.get(), c.Module) << c.Bus << ":" << c.Device;
    }
    GetModuleName(&Adapter, "/absent");
    EXPECT_NE(Tree.Log().find("fopen() failed (0x00000002):  No such file or directory\n\n"
                              "                        file:  /absent/devices\n\n"),
              std::string::npos);
}

TEST_F(Naming, DriverFileFromTheMarkerSymbol) {
    const std::string marker = "__insmod_e1000_O";
    struct {
        std::vector<std::string> Symbols;
        const wchar_t* Driver;
    } cases[] = {
        {{"e1000_probe", marker + "/lib/x/e1000.o_M1234_V2"}, L"/lib/x/e1000.o"},
        {{marker + "/e1000.o"}, L""},  // without its two parts
        {{marker + "/e1000.o_V2"}, L""},
        {{marker + "/a.o_M1_V2", marker + "/b_c.o_M1_V2"}, L"/b_c.o"},  // the last one
    };
    for (const auto& c : cases) {
        FakeModules().Modules = {{"e1000", 1, {}, {}}};
        for (const std::string& symbol : c.Symbols) {
            FakeModules().Modules[0].Symbols.emplace_back(0x1000, symbol);
        }
        Adapter.ModuleName = DupHeapCString("e1000");
        EXPECT_TRUE(GetDriverName(&Adapter));
        EXPECT_EQ(Adapter.Driver, c.Driver) << c.Symbols.back();
    }
}

TEST_F(Naming, BootDeviceFromTheInitialRamDiskModules) {
    struct {
        const char *Sysconfig, *Module;
        bool Boot;
    } cases[] = {
        {"INITRD_MODULES=\"reiserfs e1000\"\n", "e1000", true},
        {"INITRD_MODULES=\"reiserfs e1000\"\n", "e100", false},
        {"INITRD_MODULES=e1000\n", "e1000", false},
        {"#INITRD_MODULES=\"e1000\"\nX=\"e1000\"\n", "e1000", false},
        {"INITRD_MODULES=\"e1000\n", "e1000", true},  // one double quote
        {"INITRD_MODULES_X=\"a\" # \"e1000\"\nINITRD_MODULES=\"b e1000\"", "e1000", true},
        {"INITRD_MODULES=\"ehci_pci\"\n", "ehci-pci", true},
        {"INITRD_MODULES=\"reiserfs\" e1000\n", "e1000", false},  // after the list
    };
    for (const auto& c : cases) {
        Tree.Scratch().Write("kernel", c.Sysconfig);
        Adapter.ModuleName = DupHeapCString(c.Module);
        EXPECT_TRUE(IsBootDevice(&Adapter));
        EXPECT_EQ(Adapter.IsBootDev, c.Boot) << c.Sysconfig << " / " << c.Module;
    }
    SysPaths().SysconfigKernel = Tree.Scratch().Path("absent");
    EXPECT_FALSE(IsBootDevice(&Adapter));
    EXPECT_FALSE(Adapter.IsBootDev);
}
