// Writing a machine's /proc/bus/pci: one folder per bus ("BB", or "DDDD:BB" outside domain 0), one
// file per function ("DD.F") holding exactly the dumped configuration bytes, and "devices" in the
// layout of a 32-bit 2.4 kernel.
#pragma once

#include <string>
#include <vector>

#include "sim/machine/lspcidump.h"

namespace velhsim {

// The function's line of "devices": devfn key, vendor and device, IRQ, seven base addresses,
// seven sizes, a tab and the bound driver's name, and the line end.
std::string DevicesLine(const PciFunctionDump& function);

// Writes the tree into `dir` (created when missing); false with a message on failure.
bool WritePciTree(const std::vector<PciFunctionDump>& functions, const std::string& dir,
                  std::string* error);

// Reads an lspci dump file and writes its tree.
bool BuildPciTree(const std::string& dumpPath, const std::string& dir, std::string* error);

}  // namespace velhsim
