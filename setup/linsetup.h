// Prerequisite checks (supported distribution, kernel, PCI architecture file or slot driver),
// operating-system identification and the agent statistics record.
#pragma once

#include <sys/utsname.h>

#include <cstddef>
#include <cstdint>
#include <string>

#include "agentstats.h"

constexpr const wchar_t* AGENT_VERSION = L"4.20";

// Prerequisite error codes, in the order the checks produce them.
constexpr uint32_t PREREQ_OK = 0;
constexpr uint32_t PREREQ_NO_DRIVER = 4;
constexpr uint32_t PREREQ_DRIVER_VERSION = 6;
constexpr uint32_t PREREQ_NO_ASL_TABLE = 7;
constexpr uint32_t PREREQ_OS_VENDOR = 8;
constexpr uint32_t PREREQ_OS_PRODUCT = 9;
constexpr uint32_t PREREQ_KERNEL_VERSION = 10;

extern _AgentStats AgentStatistics;

// Supported distributions: parallel tables of release-file name, vendor word and product word.
constexpr int SUPPORTED_OS_COUNT = 1;
constexpr size_t OS_TABLE_TEXT = 64;
extern const char OsDistFiles[SUPPORTED_OS_COUNT][OS_TABLE_TEXT];
extern const char OsVendors[SUPPORTED_OS_COUNT][OS_TABLE_TEXT];
extern const char OsProducts[SUPPORTED_OS_COUNT][OS_TABLE_TEXT];

constexpr int OS_LINE_CHARS = 1024;

// The kernel's identification record and the first line of the distribution's release file.
struct OsInformation {
    struct utsname Uts;
    char Line[OS_LINE_CHARS];
};

extern OsInformation OsInfo;
// The kernel release cut at its first "-" (points into OsInfo); null until identified.
extern const char* KernVersion;
// Vendor and product words of the release file (point into OsInfo), set only when both match.
extern const char* Distributor;
extern const char* DistVersion;
extern bool SupportedOsVendor;
extern bool SupportedOsProduct;
extern bool UsingPciFile;
// The slot driver module is loaded and running.
extern bool DriverLoaded;
extern bool DriverVerValid;
extern const char* DriverVersion;
extern bool AslTableAvailable;

// Stores the agent version and the outcome of the checks in AgentStatistics.
void SetupVelhSlot();
// Runs every check; stores the code where preReqError points (if not null). True for code 0.
bool CheckPreRequisites(uint32_t* preReqError);
void InitCheckPreReqs();
int IdentifyOS();
bool GetOS(OsInformation* info);
// Dotted decimal versions over at most 16 fields: -1 lower, 0 equal, 1 higher, -2 error.
int VerCompare(const char* version1, const char* version2, int fields);
// Splits off the next field at separator, skipping repeated separators; null at the end.
char* GetField(char** cursor, char separator);

// Puts the facts gathered once per library lifetime (the OS identification and whether the
// driver gave a table) back to their load-time state. Tests only; the library never calls it.
void ResetPreReqState();
