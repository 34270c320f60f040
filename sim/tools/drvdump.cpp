// drvdump FOLDER: asks /dev/velhpdrv for its version and table, through the library's own
// driver access, and writes them as a machine folder's driver/version and driver/asl.bin.
// Exits 1 without writing anything when the driver does not answer the version request.
#include <cstdio>
#include <memory>
#include <new>
#include <string>

#include "asl.h"
#include "filehandle.h"
#include "sources/linhw.h"

namespace {

bool WriteFile(const std::string& path, const void* data, size_t size) {
    UniqueFile file(std::fopen(path.c_str(), "wb"));
    return file != nullptr && std::fwrite(data, 1, size, file.get()) == size &&
           std::fclose(file.release()) == 0;
}

}  // namespace

int main(int argc, char** argv) {
    if (argc != 2) {
        std::fprintf(stderr, "usage: drvdump FOLDER\n");
        return 2;
    }
    const std::string folder = argv[1];
    const char* version = GetDriverVersion();
    if (version == nullptr) {
        std::fprintf(stderr, "drvdump: the slot driver does not answer\n");
        return 1;
    }
    std::unique_ptr<_ASL_PACKET> packet(new (std::nothrow) _ASL_PACKET());
    const uint32_t size = packet != nullptr ? GetAslTable(packet.get()) : 0;
    const std::string line = std::string(version) + "\n";
    if (!WriteFile(folder + "/version", line.data(), line.size()) ||
        !WriteFile(folder + "/asl.bin", packet.get(), size)) {
        std::perror(("drvdump: " + folder).c_str());
        return 1;
    }
    std::printf("version %s, table %u bytes\n", version, size);
    return 0;
}
