#include <gtest/gtest.h>

#include <cstring>
#include <string>
#include <tuple>
#include <vector>

#include "adapters/cfgspace.h"
#include "adapters/linadapt.h"
#include "hw/adapterxref.h"
#include "hw/busspeed.h"
#include "scratchdir.h"

namespace {

// A configuration file of `size` bytes with the status word's low byte and the given bytes set.
std::string Config(size_t size, int status, std::vector<std::pair<int, int>> bytes) {
    std::string file(size, '\0');
    file[6] = static_cast<char>(status);
    for (auto [at, value] : bytes) {
        file[at] = static_cast<char>(value);
    }
    return file;
}

const _PCI_CONFIG0* Image(const std::string& bytes) {
    return reinterpret_cast<const _PCI_CONFIG0*>(bytes.data());
}

TEST(CapabilityWalk, ReadsKnownItemsWithinTheImageAndDerivesPciX) {
    // File, image length, MaxSpeed, Width (0: no PCI-X item found).
    const std::tuple<std::string, int, uint32_t, uint32_t> cases[] = {
        {Config(256, 0x20, {{0x34, 0x40}, {0x40, 7}}), 64, 66, 0},  // no list
        {Config(256, 0x10, {{0x34, 0x40}, {0x40, 1}, {0x41, 0x50}, {0x50, 5}, {0x52, 0x80}}), 0x5E,
         33, 0},
        {Config(256, 0x10, {{0x34, 0x40}, {0x40, 5}}), 0x4A, 33, 0},
        {Config(256, 0x10, {{0x34, 0x40}, {0x40, 2}}), 0x4C, 33, 0},  // AGP
        {Config(256, 0x10, {{0x34, 0x40}, {0x40, 3}}), 0x48, 33, 0},  // VPD
        {Config(256, 0x10, {{0x34, 0x40}, {0x40, 4}}), 0x44, 33, 0},  // slot ID
        {Config(256, 0x10, {{0x34, 0x40}, {0x40, 9}, {0x41, 0x50}, {0x50, 7}}), 64, 33, 0},
        {Config(4096, 0x10, {{0x34, 0xF8}, {0xF8, 7}, {0xFE, 3}}), 256, 133, 64},
        {Config(256, 0x10, {{0x34, 0x40}, {0x40, 7}}), 0x48, 66, 32},
        {Config(4096, 0x10, {{0x34, 0xF4}, {0xF4, 5}, {0xF6, 0x80}}), 0xF4, 33, 0},
        {Config(256, 0x10, {{0x34, 0x40}, {0x40, 1}, {0x41, 0xF8}, {0xF8, 5}}), 0xF8, 33, 0},
        {Config(256, 0x10, {{0x34, 0xFC}, {0xFC, 7}}), 0xFC, 33, 0},
        {Config(256, 0x10, {{0x34, 0x40}, {0x40, 1}, {0x41, 0x40}}), 0x48, 33, 0},  // loop
        {Config(64, 0x10, {{0x34, 0x40}}), 64, 33, 0},
        {Config(63, 0, {}), 0, 33, 0},
    };
    InstallTree tree;
    for (const auto& [file, length, speed, width] : cases) {
        std::string image(PCI_CONFIG_SIZE, '\0');
        const std::string path = tree.Scratch().Write("cfg", file);
        ASSERT_EQ(GetPciConfig(path.c_str(), 0, 256, image.data()), length) << file.size();
        AdapterDescriptor adapter;
        StorePciConfig(Image(image), &adapter, length);
        EXPECT_EQ(std::tie(adapter.MaxSpeed, adapter.Width, adapter.SupPciX),
                  std::make_tuple(speed, width, width != 0))
            << length;
        EXPECT_EQ(GetCap(Image(image), CAP_PCIX, 0x40), nullptr);
    }
    // Nothing is read from an offset outside the image.
    std::string image(PCI_CONFIG_SIZE, '\0');
    const std::string path = tree.Scratch().Write("cfg", Config(64, 0, {}));
    EXPECT_EQ(GetPciConfig(path.c_str(), -1, 256, image.data()), 0);
    EXPECT_EQ(GetPciConfig(path.c_str(), 64, 256, image.data()), 0);
    EXPECT_NE(tree.Log().find("nothing above offset 0x40 (0x00000000)"), std::string::npos);
    EXPECT_NE(tree.Log().find("cut after 48 items"), std::string::npos);
    EXPECT_NE(tree.Log().find("item at 0xf4 reaches past"), std::string::npos);
    // The end of a 256-byte file cuts an item short: a short read, not an item past the image.
    EXPECT_TRUE(tree.Logged("ReadCapabilityItem():  item read() failed (0x00000000)"));
    EXPECT_FALSE(tree.Logged("item at 0xf8"));

    // A bridge, by header type or by base class, is not identified by its subsystem registers.
    for (auto [at, value, id] : {std::tuple{0x0E, 0, L"12340000567800ab05"},
                                 {0x0E, 1, L"123400000000000005"},
                                 {0x0B, 6, L"123400000000000005"}}) {
        const std::string bytes = Config(
            256, 0,
            {{0, 0x34}, {1, 0x12}, {8, 5}, {0x2C, 0x78}, {0x2D, 0x56}, {0x2E, 0xab}, {at, value}});
        AdapterDescriptor adapter;
        StorePciConfig(Image(bytes), &adapter, 64);
        EXPECT_EQ(adapter.PciId, id);
    }
}

TEST(ProcBusPci, BusFoldersAndFunctionFiles) {
    _FILE_ATTRIBS entry{};
    uint32_t device = 0, function = 0;
    const std::pair<const char*, int> busses[] = {
        {"1f", 0x1f},    {"0000:00", 0},  {"0000:0a", 10},  {"0000:zz", 0},
        {"0e:03", 0x0e}, {"1f:zz", 0x1f}, {"0001:1f.x", 1}, {"x1", -1}};
    for (auto [name, bus] : busses) {
        std::strcpy(entry.EntryName, name);
        EXPECT_EQ(isBus(&entry, &device) ? static_cast<int>(device) : -1, bus) << name;
    }
    for (auto [name, both] :
         {std::pair{"1f.3", 0x1f3}, {"00.0", 0}, {"00.10", -1}, {"000.0", -1}, {"0x.1", -1}}) {
        std::strcpy(entry.EntryName, name);
        const bool found = isAdapter(&entry, &device, &function);
        EXPECT_EQ(found ? static_cast<int>(device << 4 | function) : -1, both) << name;
    }
}

TEST(KeepAdapter, RemovesCardBridgedAndSlotlessFunctionsAndOnBoardBridges) {
    // In a slot, bus with visible slots, on board, bridge, reason for removal.
    for (auto [inSlot, busHasSlots, onBoard, bridge, why] :
         {std::tuple{true, true, false, true, L""},
          {false, true, true, false, L""},
          {false, true, true, true, L"Device is an onboard bridge"},
          {false, true, false, false, L"Device is under a bridge on a card"},
          {true, false, false, false, L"Device is on a bus without slots"}}) {
        AdapterDescriptor adapter;
        adapter.OnBoard = onBoard;
        adapter.HasBridge = bridge;
        const wchar_t* reason = nullptr;
        EXPECT_EQ(KeepAdapter(inSlot, busHasSlots, &adapter, &reason), *why == L'\0');
        EXPECT_STREQ(reason, why);
    }
    EXPECT_EQ(std::vector(
                  {SlotPowerReq(0x07), SlotPowerReq(0x08), SlotPowerReq(0x10), SlotPowerReq(0x18)}),
              std::vector({8u, 15u, 25u, 0u}));
}

TEST(DeriveCurrentBusSpeeds, SettlesOnTheFastestStepThatCarriesTheLoad) {
    using Adapters = std::vector<std::pair<uint32_t, bool>>;  // MaxSpeed, SupPciX
    const std::pair<uint32_t, bool> x133{133, true};
    // Adapters, LoadAtX133, LoadAtX100, the slower limits (else 0), speed, PCI-X mode.
    const std::tuple<Adapters, uint32_t, uint32_t, bool, uint32_t, bool> cases[] = {
        {Adapters(2, x133), 1, 2, true, 100, true},
        {Adapters(3, x133), 1, 2, true, 66, true},
        {Adapters(5, x133), 1, 2, true, 33, false},
        {{x133, {66, false}}, 1, 2, true, 66, false},
        {{}, 1, 2, true, 133, true},
        {{}, 0, 0, true, 66, true},
        {{}, 0, 0, false, 33, false},
        {{{266, true}}, 1, 2, true, 133, true},
        {{{50, false}}, 1, 2, true, 50, false}};
    for (const auto& [adapters, atX133, atX100, slower, speed, pcix] : cases) {
        auto* bus = new BusDescriptor{.BusID = 2,
                                      .LoadAt33 = slower ? 4u : 0,
                                      .LoadAt66 = slower ? 2u : 0,
                                      .LoadAtX66 = slower ? 4u : 0,
                                      .LoadAtX100 = atX100,
                                      .LoadAtX133 = atX133};
        BusList.Add(bus);
        for (auto [maxSpeed, supPciX] : adapters) {
            auto* adapter = new AdapterDescriptor;
            adapter->BusID = 2;
            adapter->MaxSpeed = maxSpeed;
            adapter->SupPciX = supPciX;
            AdapterList.Add(adapter);
        }
        DeriveCurrentBusSpeeds();
        EXPECT_EQ(std::tie(bus->CurBusSpeed, bus->InPciXMode), std::tie(speed, pcix))
            << adapters.size();
        AdapterList.DestroyAll();
        BusList.DestroyAll();
    }
}

}  // namespace
