// Each adapter's kernel module, driver object file and boot-device flag.
#pragma once

#include "model/hwobjects.h"

// Sets ModuleName from the PCI device list in procRoot.
void GetModuleName(AdapterDescriptor* adapter, const char* procRoot);
// Sets Driver; false only when the search text cannot be allocated.
bool GetDriverName(AdapterDescriptor* adapter);
// Sets IsBootDev; false only when /etc/sysconfig/kernel cannot be opened.
bool IsBootDevice(AdapterDescriptor* adapter);
