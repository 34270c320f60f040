#include "sources/pcifile.h"

#include <cstring>

#include "adapters/linvpd.h"
#include "filehandle.h"
#include "util/instdir.h"

namespace {

constexpr size_t TYPE_CHARS = 4;
constexpr size_t TYPE_MODEL_CHARS = sizeof(Vpd.MachineTypeModel);
constexpr char PCI_EXTENSION[] = ".pci";

char fileName[TYPE_MODEL_CHARS + sizeof(PCI_EXTENSION)];
static_assert(sizeof(fileName) == 12, "seven name characters, the extension and a terminator");

// Builds the name from the first chars of the machine type and model (stopping at a zero byte)
// into fileName and tells whether that file is in the install directory.
bool NameExists(size_t chars) {
    size_t length = 0;
    while (length < chars && Vpd.MachineTypeModel[length] != '\0') {
        fileName[length] = Vpd.MachineTypeModel[length];
        length++;
    }
    std::memcpy(fileName + length, PCI_EXTENSION, sizeof(PCI_EXTENSION));
    // An empty type names no machine, and a slash would reach out of the install directory.
    if (length == 0 || std::memchr(fileName, '/', length) != nullptr) {
        return false;
    }
    UniqueMalloc<char> path(InstallDirFile(fileName));
    return path != nullptr && Exist(path.get());
}

}  // namespace

char* FindPciFile() {
    if (!ValidVPD) {
        return nullptr;
    }
    if (NameExists(TYPE_MODEL_CHARS) || NameExists(TYPE_CHARS)) {
        return fileName;
    }
    return nullptr;
}
