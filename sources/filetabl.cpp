#include "sources/filetabl.h"

#include <algorithm>
#include <cstddef>
#include <cstring>

#include "diag/hwdebug.h"
#include "diag/linport.h"
#include "filehandle.h"
#include "sources/pcifile.h"
#include "util/instdir.h"
#include "util/parstool.h"

namespace {

constexpr uint32_t HEADER_SIZE = sizeof(_ASL_TABLE_HEADER);
constexpr uint32_t FIXED_DESCRIPTOR_SIZE = 16;
// Type byte, string number and terminator around the text.
constexpr uint32_t STRING_OVERHEAD = 3;

enum ParseMode : int32_t {
    PARSE_NONE = 0,
    PARSE_HEADER = 1,
    PARSE_BUS = 2,
    PARSE_SLOT = 3,
    PARSE_CHASSIS = 4,
    PARSE_DRAWER = 5,
    PARSE_STRING = 6,
};

struct Section {
    const char* Line;
    ParseMode Mode;
};

const Section Sections[] = {
    {"[table header]", PARSE_HEADER}, {"[bus]", PARSE_BUS},       {"[slot]", PARSE_SLOT},
    {"[chassis]", PARSE_CHASSIS},     {"[drawer]", PARSE_DRAWER}, {"[string]", PARSE_STRING},
};

// The next token as a number, unvalidated; a line that has run out of tokens gives 0.
uint32_t NextNumber(char** cursor) {
    char* token = GetToken(cursor);
    return token == nullptr ? 0 : static_cast<uint32_t>(StrNum(token));
}

uint8_t NextByte(char** cursor) {
    return static_cast<uint8_t>(NextNumber(cursor));
}

// The next token's first width characters, padded with NUL bytes; a missing token is all NULs.
void NextText(char** cursor, char* field, size_t width) {
    const char* token = GetToken(cursor);
    std::strncpy(field, token == nullptr ? "" : token, width);
}

template <typename Descriptor, uint8_t Descriptor::*Id>
uint32_t StoreSystem(Descriptor* descriptor, uint8_t type, char* line) {
    std::memset(descriptor, 0, sizeof(Descriptor));
    descriptor->DescriptorType = type;
    descriptor->Length = FIXED_DESCRIPTOR_SIZE;
    descriptor->*Id = NextByte(&line);
    descriptor->StringID = NextByte(&line);
    return FIXED_DESCRIPTOR_SIZE;
}

ParseMode SectionMode(char* line) {
    _strlwr(line);
    for (const Section& section : Sections) {
        if (std::strcmp(line, section.Line) == 0) {
            return section.Mode;
        }
    }
    return PARSE_NONE;
}

bool IsSectionLine(const char* line) {
    size_t length = std::strlen(line);
    return length > 0 && line[0] == '[' && line[length - 1] == ']';
}

// Builds one descriptor of the section into place; its size.
uint32_t StoreDescriptor(ParseMode mode, RAW_ASL_DATA* place, char* line) {
    switch (mode) {
        case PARSE_BUS:
            return StoreBus(reinterpret_cast<_ASL_BUS_DESCRIPTOR*>(place), line);
        case PARSE_SLOT:
            return StoreSlot(reinterpret_cast<_ASL_SLOT_DESCRIPTOR*>(place), line);
        case PARSE_CHASSIS:
            return StoreChassis(reinterpret_cast<_ASL_CHASSIS_DESCRIPTOR*>(place), line);
        case PARSE_DRAWER:
            return StoreDrawer(reinterpret_cast<_ASL_DRAWER_DESCRIPTOR*>(place), line);
        case PARSE_STRING:
            return StoreString(reinterpret_cast<_ASL_STRING_DESCRIPTOR*>(place), line);
        default:
            return 0;
    }
}

}  // namespace

uint32_t StoreHeader(_ASL_TABLE_HEADER* header, char* line) {
    std::memset(header, 0, sizeof(_ASL_TABLE_HEADER));
    NextText(&line, header->Signature, sizeof(header->Signature));
    header->Length = HEADER_SIZE;
    header->Revision = NextByte(&line);
    header->MinorRevision = NextByte(&line);
    NextText(&line, header->MachineID, sizeof(header->MachineID));
    return HEADER_SIZE;
}

uint32_t StoreBus(_ASL_BUS_DESCRIPTOR* descriptor, char* line) {
    std::memset(descriptor, 0, sizeof(_ASL_BUS_DESCRIPTOR));
    descriptor->DescriptorType = BUS_TYPE;
    descriptor->Length = FIXED_DESCRIPTOR_SIZE;
    for (uint8_t* field :
         {&descriptor->BusID, &descriptor->ChassisID, &descriptor->DrawerID, &descriptor->BusNumber,
          &descriptor->ParentBusID, &descriptor->Attribute, &descriptor->CurrentBusSpeed,
          &descriptor->MaxAdapterAt33, &descriptor->MaxAdapterAt66, &descriptor->MaxAdapterAtX66,
          &descriptor->MaxAdapterAtX100, &descriptor->MaxAdapterAtX133}) {
        *field = NextByte(&line);
    }
    return FIXED_DESCRIPTOR_SIZE;
}

uint32_t StoreSlot(_ASL_SLOT_DESCRIPTOR* descriptor, char* line) {
    std::memset(descriptor, 0, sizeof(_ASL_SLOT_DESCRIPTOR));
    descriptor->DescriptorType = SLOT_TYPE;
    descriptor->Length = FIXED_DESCRIPTOR_SIZE;
    descriptor->SlotID = static_cast<uint16_t>(NextNumber(&line));
    for (uint8_t* field :
         {&descriptor->BusID, &descriptor->DeviceNum, &descriptor->Sun, &descriptor->Attrib1,
          &descriptor->Attrib2, &descriptor->AttnReason, &descriptor->Status,
          &descriptor->LedStatus, &descriptor->SlotUiNumber}) {
        *field = NextByte(&line);
    }
    return FIXED_DESCRIPTOR_SIZE;
}

uint32_t StoreChassis(_ASL_CHASSIS_DESCRIPTOR* descriptor, char* line) {
    return StoreSystem<_ASL_CHASSIS_DESCRIPTOR, &_ASL_CHASSIS_DESCRIPTOR::ChassisID>(
        descriptor, CHASSIS_TYPE, line);
}

uint32_t StoreDrawer(_ASL_DRAWER_DESCRIPTOR* descriptor, char* line) {
    return StoreSystem<_ASL_DRAWER_DESCRIPTOR, &_ASL_DRAWER_DESCRIPTOR::DrawerID>(
        descriptor, DRAWER_TYPE, line);
}

uint32_t StoreString(_ASL_STRING_DESCRIPTOR* descriptor, char* line) {
    descriptor->DescriptorType = STRING_TYPE;
    descriptor->StringNum = NextByte(&line);
    const char* text = GetToken(&line);
    if (text == nullptr) {
        text = "";
    }
    size_t length = std::strlen(text);
    // The text runs past the record's one declared character.
    char* target = reinterpret_cast<char*>(descriptor) + offsetof(_ASL_STRING_DESCRIPTOR, String);
    std::memcpy(target, text, length + 1);
    return STRING_OVERHEAD + static_cast<uint32_t>(length);
}

uint32_t ReadFileTable(FILE* stream, _ASL_PACKET* packet, uint32_t size, uint32_t* packetEnd) {
    if (packetEnd != nullptr) {
        *packetEnd = 0;
    }
    if (stream == nullptr || packet == nullptr) {
        return 0;
    }
    size = std::min<uint32_t>(size, sizeof(_ASL_PACKET));
    if (size < HEADER_SIZE + 1) {
        ErrMsg("ReadFileTable()", "Packet buffer of %u bytes holds no table", size);
        return 0;
    }
    // A file without a header line must not pass for a packet with whatever the buffer held.
    auto* bytes = reinterpret_cast<RAW_ASL_DATA*>(packet);
    std::memset(bytes, 0, size);

    // A descriptor is built here first and copied only if it fits before the end marker.
    RAW_ASL_DATA scratch[STRING_OVERHEAD + PCI_FILE_LINE_CHARS];
    char buffer[PCI_FILE_LINE_CHARS];
    ParseMode mode = PARSE_NONE;
    uint32_t count = 0;
    uint32_t place = HEADER_SIZE;
    uint32_t lineNumber = 0;
    while (getline(stream, buffer, sizeof(buffer))) {
        lineNumber++;
        char* line = TrimLine(buffer);
        if (*line == '\0') {
            continue;
        }
        if (IsSectionLine(line)) {
            mode = SectionMode(line);
            continue;
        }
        if (mode == PARSE_NONE) {
            dbgprint("\n");
            dbgprint("ParseLine(): unknown parse mode %d\n", static_cast<int>(mode));
            dbgprint("\n");
            continue;
        }
        if (mode == PARSE_HEADER) {
            count += StoreHeader(&packet->Header, line);
            continue;
        }
        uint32_t length = StoreDescriptor(mode, scratch, line);
        if (length > size - 1 - place) {
            ErrMsg("ReadFileTable()",
                   "Table exceeds the packet buffer of %u bytes at line %u, rest of file ignored",
                   size, lineNumber);
            break;
        }
        std::memcpy(bytes + place, scratch, length);
        place += length;
        count += length;
    }
    bytes[place] = END_TYPE;
    if (packetEnd != nullptr) {
        *packetEnd = place + 1;
    }
    return count + 1;
}

uint32_t GetFileTable(_ASL_PACKET* packet, uint32_t size) {
    const char* name = FindPciFile();
    if (name == nullptr) {
        return 0;
    }
    UniqueMalloc<char> path(InstallDirFile(name));
    if (path == nullptr) {
        return 0;
    }
    UniqueFile stream(std::fopen(path.get(), "r"));
    path.reset();
    if (stream == nullptr) {
        LastErr(nullptr, "GetFileTable", "fopen() failed");
        return 0;
    }
    return ReadFileTable(stream.get(), packet, size);
}
