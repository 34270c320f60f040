// The adapter card file "velhadp.crd": adapters that the operator declares because the bus walk
// cannot see them, read into FileAdapters, tied to their slots and merged into AdapterList.
#pragma once

#include <cstdint>
#include <cstdio>
#include <memory>

#include "model/hwobjects.h"

// Size of the line buffer; a longer line comes in pieces that count as lines of their own.
constexpr int CARD_LINE_CHARS = 2048;
// Tokens of one adapter record, the name first and the driver last.
constexpr int32_t CARD_RECORD_FIELDS = 11;

// The parser's state carries over from one line to the next within one read of the file.
extern int32_t LineNum;
extern int32_t ParseState;
extern int32_t ParseError;
// The record under way; created by the first read, replaced when a record completes.
extern std::unique_ptr<AdapterDescriptor> CardDesc;
extern char FileName[12];

// Reads the card file of the install directory; the number of adapters it declared.
int GetAdapterFile();
// Reads stream to its end, replacing what an earlier read left in FileAdapters.
int ReadAdapterFile(FILE* stream);
// Feeds the tokens of one prepared line to the parser; the number of records they completed.
int ParseLine(char* line);

bool IsAdapterName(char* token);
bool IsFunctionNum(char* token);
bool IsBusSpeed(char* token);
bool IsPowerReq(char* token);
bool IsBusWidth(char* token);

// Completes every declared adapter from the slot it names.
void XRefAdapterFile();
// Describes each declared adapter's slot in AdapterList with it: the slot's first adapter is
// overwritten, or a copy is added. FileAdapters keeps and owns every descriptor it holds, and
// AdapterList owns its copies, so each list destroys only its own objects.
void MergeAdapterFile();
