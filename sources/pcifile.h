// The choice of this machine's PCI architecture file by its firmware's machine type and model.
#pragma once

// The file name (not the path) in the install directory: type and model, else type alone, with
// ".pci"; null without valid vital product data or without such a file. Points to a static
// buffer that stays valid until the next call.
char* FindPciFile();
