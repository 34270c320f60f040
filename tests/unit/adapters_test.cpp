#include <gtest/gtest.h>
#include <sys/stat.h>

#include <cstring>
#include <string>
#include <vector>

#include "adapters/cfgspace.h"
#include "hw/adapterxref.h"
#include "hw/busspeed.h"
#include "scratchdir.h"

namespace {

// A configuration file: `size` zero bytes with the status word and the given bytes set.
std::string ConfigFile(size_t size, uint16_t status, std::vector<std::pair<int, int>> bytes) {
    std::string file(size, '\0');
    file[6] = static_cast<char>(status);
    for (auto [at, value] : bytes) {
        file[at] = static_cast<char>(value);
    }
    return file;
}

constexpr uint16_t CAPS = PCI_STATUS_CAP_LIST;

TEST(CapabilityWalk, ReadsKnownItemsWithinTheImageAndDerivesPciX) {
    struct Case {
        const char* Name;
        std::string File;
        int Length;  // returned by GetPciConfig
        uint32_t MaxSpeed, Width;
        bool PciX;
    };
    const Case cases[] = {
        {"no capability bit", ConfigFile(256, 0x20, {{0x34, 0x40}, {0x40, 7}}), 64, 66, 0, false},
        {"power management then 64-bit MSI",
         ConfigFile(256, CAPS, {{0x34, 0x40}, {0x40, 1}, {0x41, 0x50}, {0x50, 5}, {0x52, 0x80}}),
         0x50 + 14, 33, 0, false},
        {"32-bit MSI", ConfigFile(256, CAPS, {{0x34, 0x40}, {0x40, 5}}), 0x40 + 10, 33, 0, false},
        {"unknown ID ends the walk",
         ConfigFile(256, CAPS, {{0x34, 0x40}, {0x40, 9}, {0x41, 0x50}, {0x50, 7}}), 64, 33, 0,
         false},
        {"PCI-X 133 64-bit at the image's end",
         ConfigFile(4096, CAPS, {{0x34, 0xF8}, {0xF8, 7}, {0xFE, 3}}), 256, 133, 64, true},
        {"PCI-X 66 32-bit", ConfigFile(256, CAPS, {{0x34, 0x40}, {0x40, 7}}), 0x48, 66, 32, true},
        {"item reaching past the image",
         ConfigFile(4096, CAPS, {{0x34, 0xF4}, {0xF4, 5}, {0xF6, 0x80}}), 64, 33, 0, false},
        {"loop", ConfigFile(256, CAPS, {{0x34, 0x40}, {0x40, 1}, {0x41, 0x40}}), 0x48, 33, 0,
         false},
        {"file of the header only", ConfigFile(64, CAPS, {{0x34, 0x40}}), 64, 33, 0, false},
        {"short header", ConfigFile(63, 0, {}), 0, 0, 0, false},
    };
    InstallTree tree;
    for (const Case& c : cases) {
        SCOPED_TRACE(c.Name);
        char image[PCI_CONFIG_SIZE] = {};
        const int length =
            GetPciConfig(tree.Scratch().Write("cfg", c.File).c_str(), 0, sizeof(image), image);
        ASSERT_EQ(length, c.Length);
        if (length == 0) {
            continue;
        }
        // Only the header and the items read reach the image.
        EXPECT_EQ(std::memcmp(image, c.File.data(), length), 0);
        EXPECT_EQ(std::string(image + length, sizeof(image) - length).find_first_not_of('\0'),
                  std::string::npos);
        AdapterDescriptor adapter;
        StorePciConfig(reinterpret_cast<_PCI_CONFIG0*>(image), &adapter, length);
        EXPECT_EQ(adapter.SupPciX, c.PciX);
        EXPECT_EQ(adapter.MaxSpeed, c.MaxSpeed);
        EXPECT_EQ(adapter.Width, c.Width);
        EXPECT_EQ(GetCap(reinterpret_cast<_PCI_CONFIG0*>(image), CAP_PCIX, 0x40), nullptr);
    }
    EXPECT_NE(tree.Log().find("cut after 48 items"), std::string::npos);
    EXPECT_NE(tree.Log().find("item at 0xf4 reaches past"), std::string::npos);
}

TEST(StorePciConfig, BridgesHideTheirSubsystemInPciId) {
    struct Case {
        int HeaderType, BaseClass;
        bool Bridge;
        const wchar_t* PciId;
    };
    const Case cases[] = {
        {0x00, 0x02, false, L"1234abcd5555000101"}, {0x01, 0x06, true, L"1234abcd0000000001"},
        {0x81, 0x06, true, L"1234abcd0000000001"},  {0x81, 0x02, false, L"1234abcd5555000101"},
        {0x02, 0x07, false, L"1234abcd5555000101"},
    };
    for (const Case& c : cases) {
        _PCI_CONFIG0 config{};
        config.VendorID = 0x1234;
        config.DeviceID = 0xabcd;
        config.RevisionID = 1;
        config.SubSysVendorID = 0x5555;
        config.SubSystemID = 0x0001;
        config.HeaderType = c.HeaderType;
        config.BaseClass = c.BaseClass;
        AdapterDescriptor adapter;
        StorePciConfig(&config, &adapter, 64);
        EXPECT_EQ(adapter.HasBridge, c.Bridge) << c.HeaderType;
        EXPECT_EQ(adapter.PciId, c.PciId) << c.HeaderType;
    }
}

TEST(XRefSlotAdapter, KeepsSlotAndOnBoardAdaptersOfBussesWithVisibleSlots) {
    // Bus 3: device 2 in slot 5 (power code 1), a hidden slot at device 4; bus 4: hidden only.
    const SlotDescriptor slots[] = {
        {.SlotID = 5, .BusNum = 3, .DevNum = 2, .FriendlyNum = 4, .Status = 1 << 3},
        {.SlotID = 6, .BusNum = 3, .DevNum = 4, .FriendlyNum = 255},
        {.SlotID = 7, .BusNum = 4, .DevNum = 1, .FriendlyNum = 255}};
    struct Case {
        uint32_t Bus, Device;
        bool OnBoard, Bridge;
        const wchar_t* Reason;
        uint32_t SlotID, PowerReq;
    };
    const Case cases[] = {
        {3, 2, true, false, L"", 5, 15},
        {3, 2, true, true, L"", 5, 15},
        {3, 9, true, false, L"", NONE_VALUE, 0},
        {3, 9, true, true, L"Device is an onboard bridge", 0, 0},
        {3, 9, false, false, L"Device is under a bridge on a card", 0, 0},
        {4, 1, true, false, L"Device is on a bus without slots", 0, 0},
        {8, 0, true, false, L"Device is on a bus without slots", 0, 0},
    };
    for (const SlotDescriptor& slot : slots) {
        SlotList.Add(new SlotDescriptor(slot));
    }
    for (const Case& c : cases) {
        auto* adapter = new AdapterDescriptor;
        adapter->Bus = c.Bus;
        adapter->Device = c.Device;
        adapter->OnBoard = c.OnBoard;
        adapter->HasBridge = c.Bridge;
        // As placed: an adapter in a slot is no longer on board.
        const bool inSlot = c.SlotID != NONE_VALUE && c.SlotID != 0;
        adapter->OnBoard = c.OnBoard && !inSlot;
        const wchar_t* reason = nullptr;
        EXPECT_EQ(KeepAdapter(inSlot, c.Bus == 3, adapter, &reason), *c.Reason == L'\0');
        EXPECT_STREQ(reason, c.Reason);
        adapter->OnBoard = c.OnBoard;
        AdapterList.Add(adapter);
    }
    XRefSlotAdapter();
    std::vector<std::vector<uint32_t>> kept;  // SlotID, PowerReq, FriendlyNum, OnBoard
    AdapterList.BeginEnumeration();
    while (const AdapterDescriptor* adapter = AdapterList.Next()) {
        kept.push_back(
            {adapter->SlotID, adapter->PowerReq, adapter->FriendlyNum, adapter->OnBoard});
    }
    EXPECT_EQ(kept, (std::vector<std::vector<uint32_t>>{
                        {NONE_VALUE, 0, NONE_VALUE, 1}, {5, 15, 4, 0}, {5, 15, 4, 0}}));
    AdapterList.DestroyAll();
    SlotList.DestroyAll();
    EXPECT_EQ(SlotPowerReq(0x18), 0u);
    EXPECT_EQ(SlotPowerReq(0x10), 25u);
    EXPECT_EQ(SlotPowerReq(0x07), 8u);
}

TEST(DeriveCurrentBusSpeeds, SettlesOnTheFastestStepThatCarriesTheLoad) {
    struct Case {
        std::vector<std::pair<uint32_t, bool>> Adapters;  // MaxSpeed, SupPciX
        uint32_t X133, X100;
        bool AllZero;
        uint32_t Speed;
        bool PciX;
    };
    const std::pair<uint32_t, bool> x133{133, true};
    const Case cases[] = {
        {{x133, x133}, 1, 2, false, 100, true},
        {{x133, x133, x133}, 1, 2, false, 66, true},
        {{x133, x133, x133, x133, x133}, 1, 2, false, 33, false},
        {{x133, {66, false}}, 1, 2, false, 66, false},
        {{}, 1, 2, false, 133, true},
        {{}, 0, 0, false, 66, true},
        {{}, 0, 0, true, 33, false},
        {{{266, true}}, 1, 2, false, 133, true},
        {{{50, false}}, 1, 2, false, 50, false},
    };
    for (const Case& c : cases) {
        auto* bus = new BusDescriptor{.BusID = 2,
                                      .LoadAt33 = 4,
                                      .LoadAt66 = 2,
                                      .LoadAtX66 = 4,
                                      .LoadAtX100 = c.X100,
                                      .LoadAtX133 = c.X133};
        if (c.AllZero) {
            *bus = BusDescriptor{.BusID = 2};
        }
        BusList.Add(bus);
        for (auto [speed, pcix] : c.Adapters) {
            auto* adapter = new AdapterDescriptor;
            adapter->BusID = 2;
            adapter->MaxSpeed = speed;
            adapter->SupPciX = pcix;
            AdapterList.Add(adapter);
        }
        DeriveCurrentBusSpeeds();
        EXPECT_EQ(bus->CurBusSpeed, c.Speed) << c.Adapters.size();
        EXPECT_EQ(bus->InPciXMode, c.PciX) << c.Adapters.size();
        AdapterList.DestroyAll();
        BusList.DestroyAll();
    }
}

}  // namespace
