#include <gtest/gtest.h>

#include <cstring>
#include <string>

#include "adapters/pciname.h"
#include "diag/hwdebug.h"
#include "tests/unit/scratchdir.h"
#include "util/sysaccess.h"

namespace {

// Other vendors' blocks, enough to carry the lookup across several read blocks.
std::string Filler(const char* firstId, int vendors) {
    std::string text;
    for (int v = 0; v < vendors; ++v) {
        char line[64];
        std::snprintf(line, sizeof line, "%s%02x  Filler %d\n", firstId, v, v);
        text += line;
        for (int d = 0; d < 40; ++d) {
            std::snprintf(line, sizeof line, "\t%04x  Part %d\n\t\t1234 abcd  Kit\n", d, d);
            text += line;
        }
    }
    return text;
}

const std::string Database = "# comment line\n" + Filler("00", 60) +
                             "0999  Other Vendor\n"
                             "\tffff  Foreign Widget\n"
                             "\n" +
                             std::string(1023 * 68, 'x') +
                             "1234  Not a vendor: the tail of an overlong line\n" +
                             "1234  Example Corp\n"
                             "\t0001  First\n"
                             "\t\t5555 0002  Under another device\n"
                             "\t\t\t\n"
                             "\tabcd  Widget\n"
                             "\t\t5555 0001  Widget Mark II\n"
                             "\t\t5555 0003  Widget #3\n"
                             "\tabce  Gadget\n"
                             "\t\t5555 0004  Under a later device\n"
                             "5678\n" +
                             Filler("a0", 60) + "\tabcd  After the vendors";

struct PciNames : ::testing::Test {
    void SetUp() override {
        SysPaths().PciIds = Tree.Scratch().Write("pci.ids", Database);
        SysPaths().PciIdsMisc = Tree.Scratch().Path("none");
        SysPaths().PciIdsHwdata = Tree.Scratch().Path("none");
    }
    void TearDown() override {
        ResetSystemAccess();
        HwInfoPrintLevel = 0;
    }
    static std::wstring Name(uint16_t vendor, uint16_t device, uint16_t subVendor,
                             uint16_t subSystem, bool* found = nullptr) {
        _PCI_CONFIG0 config{};
        config.VendorID = vendor;
        config.DeviceID = device;
        config.SubSysVendorID = subVendor;
        config.SubSystemID = subSystem;
        AdapterDescriptor adapter;
        bool result = GetAdapterName(&adapter, &config);
        if (found != nullptr) {
            *found = result;
        }
        return adapter.Name;
    }
    InstallTree Tree;
};

}  // namespace

TEST_F(PciNames, NamesFromTheDatabase) {
    struct Case {
        uint16_t Vendor, Device, SubVendor, SubSystem;
        const wchar_t* Name;
    } cases[] = {
        {0x1234, 0xabcd, 0x5555, 0x0001, L"Example Corp Widget Mark II"},
        {0x1234, 0xabcd, 0x5555, 0x0002, L"Example Corp Widget"},
        {0x1234, 0xffff, 0x5555, 0x0001, L"Example Corp unknown device"},
        {0x9999, 0x0001, 0x0000, 0x0000, L""},
        {0x1234, 0xabcd, 0x5555, 0x0003, L"Example Corp Widget "},  // "#" cuts the name
        {0x1234, 0xabcd, 0x5555, 0x0004, L"Example Corp Widget"},   // later device's subsystem
        {0x1234, 0x0001, 0x1234, 0xabcd, L"Example Corp First"},
        {0x5678, 0x0000, 0x0000, 0x0000, L"5678 unknown device"},  // vendor line of only the ID
        {0xa03b, 0x0027, 0x1234, 0xabcd, L"Filler 59 Kit"},        // last block, no line feed
        {0xa03b, 0xabcd, 0x0000, 0x0000, L"Filler 59 After the vendors"},
    };
    for (const Case& c : cases) {
        EXPECT_EQ(Name(c.Vendor, c.Device, c.SubVendor, c.SubSystem), c.Name)
            << std::hex << c.Vendor << ":" << c.Device << " " << c.SubVendor << ":" << c.SubSystem;
    }
}

TEST_F(PciNames, DatabaseElsewhereOrMissing) {
    HwInfoPrintLevel = GET_ADAPTER;
    SysPaths().PciIdsHwdata = SysPaths().PciIds;
    SysPaths().PciIds = Tree.Scratch().Path("missing");
    EXPECT_EQ(Name(0x1234, 0xabcd, 0x5555, 0x0001), L"Example Corp Widget Mark II");
    EXPECT_NE(Tree.Log().find("      vendorID:  >1234<\n      deviceID:  >abcd<\n"
                              "   subVendorID:  >5555<\n      subSysID:  >0001<\n\n"
                              "    vendorName:  >Example Corp<\n    deviceName:  >Widget<\n"
                              "    subSysName:  >Widget Mark II<\n\n"),
              std::string::npos)
        << Tree.Log();

    SysPaths().PciIdsHwdata = Tree.Scratch().Path("missing too");
    bool found = true;
    EXPECT_EQ(Name(0x1234, 0xabcd, 0x5555, 0x0001, &found), L"");
    EXPECT_FALSE(found);
    EXPECT_NE(Tree.Log().find("GetAdapterName():  fopen() failed (0x00000002)"), std::string::npos)
        << Tree.Log();
}

TEST(PciNameTrim, CommentIndentAndId) {
    struct Case {
        const char* Line;
        unsigned (*Trim)(char*);
        unsigned Length;
        const char* Rest;
    } cases[] = {
        {"abc#def", [](char* l) { return TrimComment(l, "#"); }, 3, "abc"},
        {"#only", [](char* l) { return TrimComment(l, "#"); }, 0, ""},
        {"\t\tx\ty", [](char* l) { return static_cast<unsigned>(TrimIndent(l)); }, 2, "x\ty"},
        {" \tx", [](char* l) { return static_cast<unsigned>(TrimIndent(l)); }, 0, " \tx"},
        {"\t\t", [](char* l) { return static_cast<unsigned>(TrimIndent(l)); }, 2, ""},
        {"1234  Example Corp", TrimID, 12, "Example Corp"},
        {" \t12\fx y", TrimID, 3, "x y"},
        {"5678", TrimID, 4, "5678"},
        {"5678 \t", TrimID, 6, "5678 \t"},
        {"", TrimID, 0, ""},
    };
    for (const Case& c : cases) {
        char line[64];
        std::strcpy(line, c.Line);
        EXPECT_EQ(c.Trim(line), c.Length) << c.Line;
        EXPECT_STREQ(line, c.Rest) << c.Line;
    }
}
