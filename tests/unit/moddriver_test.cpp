#include <gtest/gtest.h>

#include <string>

#include "adapters/moddriver.h"
#include "diag/hwdebug.h"
#include "tests/unit/fake_modules.h"
#include "tests/unit/scratchdir.h"
#include "util/sysaccess.h"

namespace {

struct ModDriver : ::testing::Test {
    void SetUp() override { InstallFakeModules(); }
    void TearDown() override {
        ResetSystemAccess();
        HwInfoPrintLevel = 0;
    }
    static AdapterDescriptor* WithModule(AdapterDescriptor* adapter, const char* module) {
        adapter->ModuleName = DupHeapCString(module);
        return adapter;
    }
    InstallTree Tree;
};

}  // namespace

TEST_F(ModDriver, ModuleNameFromTheDeviceList) {
    const std::string base = "\t80861010\t13\tfeb00000\t00000000\t00000000";
    Tree.Scratch().Write("devices", "02fa" + base + "\twrong\n02fb" + base + "\te1000\n0300" +
                                        base + "\t\n0308ehci-pci\n0310\tehci-pci\n" + "0318" +
                                        base + "\tehci-pci");
    struct Case {
        uint32_t Bus, Device, Function;
        const char* Module;  // null: none
    } cases[] = {
        {0x02, 0x1f, 3, "e1000"},    {0x102, 0x3f, 0xb, "e1000"},  // only the low bits count
        {0x03, 0x00, 0, nullptr},  // no driver bound: the line ends in a tab
        {0x03, 0x01, 0, nullptr},  // no tab
        {0x03, 0x02, 0, "ehci-pci"}, {0x03, 0x03, 0, "ehci-pci"},  // last line, no line feed
        {0x04, 0x00, 0, nullptr},                                  // not listed
    };
    for (const Case& c : cases) {
        AdapterDescriptor adapter;
        adapter.ModuleName = DupHeapCString("stale");
        adapter.Bus = c.Bus;
        adapter.Device = c.Device;
        adapter.Function = c.Function;
        GetModuleName(&adapter, Tree.Scratch().Path().c_str());
        if (c.Module == nullptr) {
            EXPECT_EQ(adapter.ModuleName, nullptr) << c.Bus << ":" << c.Device;
        } else {
            EXPECT_STREQ(adapter.ModuleName.get(), c.Module) << c.Bus << ":" << c.Device;
        }
    }

    AdapterDescriptor adapter;
    GetModuleName(&adapter, Tree.Scratch().Path("absent").c_str());
    EXPECT_EQ(adapter.ModuleName, nullptr);
    EXPECT_NE(Tree.Log().find("GetModuleName():  fopen() failed"), std::string::npos);
    EXPECT_NE(Tree.Log().find("                        file:  " + Tree.Scratch().Path("absent") +
                              "/devices\n\n"),
              std::string::npos)
        << Tree.Log();
}

TEST_F(ModDriver, DriverFileFromTheMarkerSymbol) {
    struct Case {
        std::vector<std::string> Symbols;
        const wchar_t* Driver;
    } cases[] = {
        {{"e1000_probe", "__insmod_e1000_O/lib/modules/x/e1000.o_M1234_V2"},
         L"/lib/modules/x/e1000.o"},
        {{"e1000_probe"}, L""},
        {{"__insmod_e1000_O/lib/e1000.o"}, L""},  // without its two parts
        {{"__insmod_e1000_O/lib/e1000.o_V2"}, L""},
        {{"__insmod_e1000_O"}, L""},
        {{"__insmod_e100_O/lib/e100.o_M1_V2"}, L""},
        {{"__insmod_e1000_O/a.o_M1_V2", "__insmod_e1000_O/b_c.o_M1_V2"}, L"/b_c.o"},
    };
    for (const Case& c : cases) {
        FakeModules().Modules.clear();
        FakeModule module{"e1000", 1, {}, {}};
        for (const std::string& symbol : c.Symbols) {
            module.Symbols.emplace_back(0x1000, symbol);
        }
        FakeModules().Modules.push_back(module);
        AdapterDescriptor adapter;
        EXPECT_TRUE(GetDriverName(WithModule(&adapter, "e1000")));
        EXPECT_EQ(adapter.Driver, c.Driver) << c.Symbols.back();
    }
    AdapterDescriptor none;
    EXPECT_TRUE(GetDriverName(&none));
    EXPECT_EQ(none.Driver, L"");
}

TEST_F(ModDriver, BootDeviceFromTheInitialRamDiskModules) {
    SysPaths().SysconfigKernel = Tree.Scratch().Path("kernel");
    struct Case {
        const char* Sysconfig;
        const char* Module;
        bool Boot;
    } cases[] = {
        {"INITRD_MODULES=\"reiserfs e1000\"\n", "e1000", true},
        {"INITRD_MODULES=\"reiserfs e1000\"\n", "e100", false},
        {"INITRD_MODULES=e1000\n", "e1000", false},
        {"#INITRD_MODULES=\"e1000\"\nX=\"e1000\"\n", "e1000", false},
        {"INITRD_MODULES=\"e1000\n", "e1000", true},  // one double quote
        {"INITRD_MODULES=\"\n", "e1000", false},
        {"INITRD_MODULES_MORE=\"a\" # \"e1000\"\nINITRD_MODULES=\"b e1000\"", "e1000", true},
        {"INITRD_MODULES=\"ehci_pci\"\n", "ehci-pci", true},
    };
    for (const Case& c : cases) {
        Tree.Scratch().Write("kernel", c.Sysconfig);
        AdapterDescriptor adapter;
        adapter.IsBootDev = true;
        EXPECT_TRUE(IsBootDevice(WithModule(&adapter, c.Module)));
        EXPECT_EQ(adapter.IsBootDev, c.Boot) << c.Sysconfig << " / " << c.Module;
    }

    HwInfoPrintLevel = GET_ADAPTER;
    SysPaths().SysconfigKernel = Tree.Scratch().Path("absent");
    AdapterDescriptor adapter;
    adapter.IsBootDev = true;
    EXPECT_FALSE(IsBootDevice(WithModule(&adapter, "e1000")));
    EXPECT_FALSE(adapter.IsBootDev);
    EXPECT_NE(Tree.Log().find("IsBootDevice():  fopen() failed"), std::string::npos) << Tree.Log();
}
