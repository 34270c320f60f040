// Builds ASL packets for tests from readable calls:
//   AslBuilder().Header().Chassis(0, 1).String(1, "Main").Bus({...}).Slot({...}).End()
#pragma once

#include <algorithm>
#include <cstdint>
#include <cstring>
#include <initializer_list>
#include <memory>
#include <string>
#include <vector>

#include "asl.h"

// Fields in descriptor order; unnamed drawers and slot numbers are 255.
struct AslBusSpec {
    uint8_t BusID = 0, ChassisID = 0, DrawerID = 255, BusNumber = 0, Speed = 0;
    uint8_t At33 = 0, At66 = 0, AtX66 = 0, AtX100 = 0, AtX133 = 0;
};

struct AslSlotSpec {
    uint16_t SlotID = 0;
    uint8_t BusID = 0, DeviceNum = 0, Sun = 255, Attrib1 = 0, Attrib2 = 0, AttnReason = 0;
    uint8_t Status = 0, LedStatus = 0, SlotUiNumber = 0;
};

class AslBuilder {
  public:
    // Revision 1.0; the machine's name is cut or padded with zeros to its six bytes.
    AslBuilder& Header(const std::string& machine = "TST001") {
        std::string id = machine.substr(0, 6);
        id.resize(9, '\0');  // and three reserved bytes
        Raw({'V', 'H', 'S', 'L', 16, 1, 0});
        Bytes.insert(Bytes.end(), id.begin(), id.end());
        return *this;
    }
    AslBuilder& Bus(const AslBusSpec& b) {
        return Fixed({BUS_TYPE, 16, b.BusID, b.ChassisID, b.DrawerID, b.BusNumber, 0, 0, b.Speed,
                      b.At33, b.At66, b.AtX66, b.AtX100, b.AtX133});
    }
    AslBuilder& Slot(const AslSlotSpec& s) {
        return Fixed({SLOT_TYPE, 16, static_cast<uint8_t>(s.SlotID & 0xFF),
                      static_cast<uint8_t>(s.SlotID >> 8), s.BusID, s.DeviceNum, s.Sun, s.Attrib1,
                      s.Attrib2, s.AttnReason, s.Status, s.LedStatus, s.SlotUiNumber});
    }
    AslBuilder& Chassis(uint8_t id, uint8_t name) { return Fixed({CHASSIS_TYPE, 16, id, 0, name}); }
    AslBuilder& Drawer(uint8_t id, uint8_t name) { return Fixed({DRAWER_TYPE, 16, id, 0, name}); }
    AslBuilder& String(uint8_t number, const std::string& text) {
        Raw({STRING_TYPE, number});
        Bytes.insert(Bytes.end(), text.c_str(), text.c_str() + text.size() + 1);
        return *this;
    }
    AslBuilder& End() { return Raw({END_TYPE}); }
    AslBuilder& Raw(std::initializer_list<uint8_t> bytes) {
        Last = Bytes.size();
        Bytes.insert(Bytes.end(), bytes);
        return *this;
    }
    // Clears bit 7 of the last descriptor's type byte: walked over, not stored.
    AslBuilder& Invalid() {
        Bytes[Last] &= 0x7F;
        return *this;
    }
    // Sets the Length byte of the last fixed descriptor.
    AslBuilder& Length(uint8_t length) {
        Bytes[Last + 1] = length;
        return *this;
    }
    size_t Size() const { return Bytes.size(); }
    // The packet in a zero-filled buffer of the full capacity, as the acquisition holds it.
    std::unique_ptr<_ASL_PACKET> Packet() const {
        auto packet = std::make_unique<_ASL_PACKET>();
        std::memcpy(packet.get(), Bytes.data(), std::min(Bytes.size(), sizeof(_ASL_PACKET)));
        return packet;
    }

    std::vector<uint8_t> Bytes;

  private:
    // A fixed descriptor: its fields, zero up to its 16 bytes.
    AslBuilder& Fixed(std::initializer_list<uint8_t> fields) {
        Raw(fields);
        Bytes.resize(Last + 16, 0);
        return *this;
    }

    size_t Last = 0;
};
