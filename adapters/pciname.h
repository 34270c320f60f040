// Adapter names from the PCI ID database.
#pragma once

#include "model/hwobjects.h"
#include "pciconfig.h"

// Sets the adapter's Name; false only when the database cannot be opened.
bool GetAdapterName(AdapterDescriptor* adapter, const _PCI_CONFIG0* config);
// Cuts the line at the first occurrence of mark; returns the remaining length.
unsigned TrimComment(char* line, const char* mark);
// Removes the leading tabs; returns how many there were.
int TrimIndent(char* line);
// Drops the ID and the white space around it; returns the remaining length.
unsigned TrimID(char* line);
