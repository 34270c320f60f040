// Bits of the debug level (HwInfoPrintLevel). Each call site tests its own bit before tracing.
#pragma once

#include <cstdint>

constexpr uint32_t RAW_ASL = 0x00000001;
constexpr uint32_t COOKED_ASL = 0x00000002;
constexpr uint32_t GET_ADAPTER = 0x00000004;
constexpr uint32_t TRACE_ACQUIRE = 0x00000010;
constexpr uint32_t TRACE_PARSE = 0x00000020;
constexpr uint32_t TRACE_STORE_ASL = 0x00000040;
constexpr uint32_t TRACE_XREF_ASL = 0x00000080;
constexpr uint32_t TRACE_STORE_SYSTEM = 0x00000100;
constexpr uint32_t TRACE_STORE_BUS = 0x00000200;
constexpr uint32_t TRACE_STORE_SLOT = 0x00000400;
constexpr uint32_t TRACE_STORE_STRING = 0x00000800;
constexpr uint32_t TRACE_PREREQ_CHECK = 0x00001000;
constexpr uint32_t SHOW_OBJECT_ADDRESS = 0x00010000;
constexpr uint32_t DUMP_SYSTEMS = 0x00020000;
constexpr uint32_t DUMP_BUSSES = 0x00040000;
constexpr uint32_t DUMP_SLOTS = 0x00080000;
constexpr uint32_t DUMP_SLOT_ADAPTERS = 0x00100000;
constexpr uint32_t DUMP_ONBOARD_ADAPTERS = 0x00200000;
constexpr uint32_t DUMP_ADAPTERS = DUMP_SLOT_ADAPTERS | DUMP_ONBOARD_ADAPTERS;
constexpr uint32_t DUMP_DELETED_ADAPTERS = 0x00400000;
constexpr uint32_t DUMP_ADAPTER_CFG_SPACE = 0x00800000;
constexpr uint32_t DUMP_AGENT_STATS = 0x01000000;
constexpr uint32_t ENTER_EXIT = 0x40000000;
constexpr uint32_t DBGPRINT_HELP = 0x80000000;

// The debug level in force; written only by GetDebugPrintLevel.
extern uint32_t HwInfoPrintLevel;
