#include "cardfile/cardfile.h"

#include <cstdlib>
#include <cstring>
#include <initializer_list>
#include <string>

#include "diag/checkedalloc.h"
#include "diag/hwdebug.h"
#include "diag/linport.h"
#include "filehandle.h"
#include "util/instdir.h"
#include "util/parstool.h"

int32_t LineNum = 0;
int32_t ParseState = 0;
int32_t ParseError = 0;
std::unique_ptr<AdapterDescriptor> CardDesc;
char FileName[12] = "velhadp.crd";

namespace {

enum CardField : int32_t {
    FIELD_NAME = 0,
    FIELD_SLOT = 1,
    FIELD_FUNCTION = 2,
    FIELD_SPEED = 3,
    FIELD_POWER = 4,
    FIELD_WIDTH = 5,
    FIELD_BRIDGE = 6,
    FIELD_BOOT = 7,
    FIELD_PCIX = 8,
    FIELD_PCI_ID = 9,
    FIELD_DRIVER = 10,
};

constexpr size_t PCI_ID_CHARS = 18;

// What the log says about a rejected token of fields 1 to 9: the line that shows the token, the
// rule, and for a boolean field the accepted words and the case note after the rule's text.
struct FieldMessage {
    const char* Invalid;
    const char* Rule;
    const char* Extra;
    bool Boolean;
};

const FieldMessage FieldMessages[] = {
    {nullptr, nullptr, nullptr, false},
    {"         Invalid Slot ID (%s)\n", "         Slot ID must be a number\n", nullptr, false},
    {"         Invalid Function Number (%s)\n",
     "         Function Number must be a number between 0 and 7\n", nullptr, false},
    {"         Invalid Bus speed (%s)\n", "         Bus speed must be 33, 66, 100 or 133\n",
     "         Pre-pend or append 'x' to denote PCI-X\n", false},
    {"         Invalid Power Requirement (%s)\n",
     "         Power Requirement must be 8, 15 or 25\n", nullptr, false},
    {"         Invalid bus width (%s)\n", "         Bus width must be 32 or 64\n", nullptr, false},
    {"         Invalid bridge value (%s)\n", "         Bridge value must one of: ", nullptr, true},
    {"         Invalid boot device value (%s)\n",
     "         Boot Device value must one of: ", nullptr, true},
    {"         Invalid PCI-X support value (%s)\n",
     "         PCI-X support value must one of: ", nullptr, true},
    {"         Invalid PCI ID (%s)\n", "         PCI ID must be 18 characters long\n", nullptr,
     false},
};

// The record being read; ParseLine has made sure that there is one.
AdapterDescriptor& Pending() {
    return *CardDesc;
}

std::unique_ptr<AdapterDescriptor> NewCard() {
    return NewObject<AdapterDescriptor>("GetAdapterFile()");
}

// The number that the trimmed token spells when it is one of the accepted texts; 0 otherwise.
uint32_t AcceptedNumber(char* token, std::initializer_list<const char*> accepted) {
    if (token == nullptr) {
        return 0;
    }
    const char* text = TrimStr(token);
    for (const char* value : accepted) {
        if (std::strcmp(text, value) == 0) {
            return static_cast<uint32_t>(std::strtoul(value, nullptr, 10));
        }
    }
    return 0;
}

uint32_t BusSpeed(char* token) {
    return AcceptedNumber(token, {"33", "66", "100", "133"});
}

uint32_t PowerReq(char* token) {
    return AcceptedNumber(token, {"8", "15", "25"});
}

uint32_t BusWidth(char* token) {
    return AcceptedNumber(token, {"32", "64"});
}

// Removes every leading `open` and blank and every trailing `close` and blank.
char* StripEnclosing(char* text, char open, char close) {
    for (;;) {
        text = TrimStr(text);
        size_t length = std::strlen(text);
        if (*text == open) {
            text++;
        } else if (length > 0 && text[length - 1] == close) {
            text[length - 1] = '\0';
        } else {
            return text;
        }
    }
}

std::wstring Widen(const char* text) {
    wchar_t wide[WIDE_BUFFER_CHARS];
    return MakeWideString(text, wide);
}

void ReportHead() {
    dbgprint("\n");
    dbgprint("  Error: %s, line %d\n", Widen(FileName).c_str(), LineNum);
}

// A message line that shows the token as the file has it.
void ReportToken(const char* format, const char* written) {
    wchar_t token[WIDE_BUFFER_CHARS];
    dbgprint(format, MakeWideString(written, token));
}

void ReportMissingName(const char* written) {
    ReportHead();
    ReportToken("         Invalid adapter name (%s)\n", written);
    dbgprint("         Name must begin with '%c' and end with '%c'\n", '[', ']');
    dbgprint("\n");
}

void ReportBlankName() {
    ReportHead();
    dbgprint("         Adapter name is blank, discarded adapter\n");
    dbgprint("\n");
}

// The rule texts hold no conversion, so they serve as their own formats.
void ReportField(int32_t field, const char* written) {
    const FieldMessage& message = FieldMessages[field];
    ReportHead();
    ReportToken(message.Invalid, written);
    dbgprint(message.Rule);
    if (message.Extra != nullptr) {
        dbgprint(message.Extra);
    }
    if (message.Boolean) {
        dbgprint("'0', '1', 'T', 'F', \"True\" or \"False\"\n");
        dbgprint("         Non-numeric values are case insensitive\n");
    }
    dbgprint("\n");
}

bool StoreFlag(char* token, bool& flag) {
    if (!IsBoolStr(token)) {
        return false;
    }
    flag = EvalBoolStr(token);
    return true;
}

// Stores a token of fields 1 to 10 in the pending record when the field accepts it. `token` is
// in lower case, `written` as the file has it.
bool StoreField(AdapterDescriptor& card, int32_t field, char* token, char* written) {
    switch (field) {
        case FIELD_SLOT:
            if (StrIsNum(token) != 1) {
                return false;
            }
            card.SlotID = static_cast<uint32_t>(StrNum(token));
            return true;
        case FIELD_FUNCTION:
            if (!IsFunctionNum(token)) {
                return false;
            }
            card.Function = static_cast<uint32_t>(token[0] - '0');
            return true;
        case FIELD_SPEED: {
            // One "x" before and one after mark PCI-X; the speed is the same either way.
            char* speed = token[0] == 'x' ? token + 1 : token;
            size_t length = std::strlen(speed);
            if (length > 0 && speed[length - 1] == 'x') {
                speed[length - 1] = '\0';
            }
            card.MaxSpeed = BusSpeed(speed);
            return card.MaxSpeed != 0;
        }
        case FIELD_POWER:
            card.PowerReq = PowerReq(token);
            return card.PowerReq != 0;
        case FIELD_WIDTH:
            card.Width = BusWidth(token);
            return card.Width != 0;
        case FIELD_BRIDGE:
            return StoreFlag(token, card.HasBridge);
        case FIELD_BOOT:
            return StoreFlag(token, card.IsBootDev);
        case FIELD_PCIX:
            return StoreFlag(token, card.SupPciX);
        case FIELD_PCI_ID:
            if (std::strlen(token) != PCI_ID_CHARS) {
                return false;
            }
            card.PciId = Widen(written);
            return true;
        case FIELD_DRIVER:
            card.Driver = Widen(StripEnclosing(written, '"', '"'));
            return true;
        default:
            return false;
    }
}

// A rejected field leaves the fields stored so far in the pending record; the next record
// overwrites every one of them.
void HandleName(char* token, bool isName, char* written) {
    if (!isName) {
        if (ParseError == 0) {
            ReportMissingName(written);
        }
        ParseError = 1;
    } else if (std::strlen(TrimStr(token)) <= 2) {
        if (ParseError == 0) {
            ReportBlankName();
        }
        ParseError = 1;
    } else {
        Pending().Name = Widen(StripEnclosing(written, '[', ']'));
        ParseState++;
        ParseError = 0;
    }
}

// Hands the complete pending record to FileAdapters; whether it could be added.
bool CompleteRecord() {
    Pending().OnBoard = false;
    const bool added =
        AddOrReport(FileAdapters, std::move(CardDesc), "GetAdapterFile()") != nullptr;
    CardDesc = NewCard();
    return added;
}

template <typename T>
T* FirstInSlot(ObjListTemp<T>& list, uint32_t slotId) {
    list.BeginEnumeration();
    while (T* object = list.Next()) {
        if (object->SlotID == slotId) {
            return object;
        }
    }
    return nullptr;
}

}  // namespace

bool IsAdapterName(char* token) {
    if (token == nullptr) {
        return false;
    }
    const char* text = TrimStr(token);
    size_t length = std::strlen(text);
    return length > 0 && text[0] == '[' && text[length - 1] == ']';
}

bool IsFunctionNum(char* token) {
    return token != nullptr && token[0] >= '0' && token[0] <= '7' && token[1] == '\0';
}

bool IsBusSpeed(char* token) {
    return BusSpeed(token) != 0;
}

bool IsPowerReq(char* token) {
    return PowerReq(token) != 0;
}

bool IsBusWidth(char* token) {
    return BusWidth(token) != 0;
}

int ParseLine(char* line) {
    int completed = 0;
    char* cursor = line;
    while (char* token = GetToken(&cursor)) {
        // Without memory for the next record the rest of the file cannot be read; the records
        // read stay.
        if (CardDesc == nullptr) {
            break;
        }
        // The token comes from a line of CARD_LINE_CHARS, so the copy holds all of it.
        char written[CARD_LINE_CHARS];
        std::snprintf(written, sizeof written, "%s", token);
        _strlwr(token);
        // The state is a global that anyone may have set: outside a record it starts one.
        if (ParseState < FIELD_NAME || ParseState > FIELD_DRIVER) {
            ParseState = FIELD_NAME;
        }

        const bool isName = IsAdapterName(token);
        if (isName) {
            ParseState = FIELD_NAME;
        }
        if (ParseState == FIELD_NAME) {
            HandleName(token, isName, written);
        } else if (StoreField(Pending(), ParseState, token, written)) {
            ParseState++;
            ParseError = 0;
        } else {
            ReportField(ParseState, written);
            ParseError = 1;
        }

        if (ParseError != 0) {
            ParseState = FIELD_NAME;
        } else if (ParseState == CARD_RECORD_FIELDS) {
            if (CompleteRecord()) {
                completed++;
            }
            ParseState = FIELD_NAME;
        }
    }
    return completed;
}

int ReadAdapterFile(FILE* stream) {
    // FileAdapters owns every descriptor it holds (the merge hands AdapterList copies).
    FileAdapters.DestroyAll();
    CardDesc = NewCard();
    LineNum = 0;
    ParseState = FIELD_NAME;
    ParseError = 0;

    int count = 0;
    char line[CARD_LINE_CHARS];
    // The line reader also returns a last line that lacks its line feed: an operator's last
    // record counts like the others.
    while (getline(stream, line, CARD_LINE_CHARS)) {
        char* prepared = TrimLine(line);
        LineNum++;
        if (*prepared != '\0') {
            count += ParseLine(prepared);
        }
    }
    return count;
}

int GetAdapterFile() {
    // Without a card file nothing is declared: an earlier read's adapters are gone with it.
    FileAdapters.DestroyAll();
    UniqueMalloc<char> path(InstallDirFile(FileName));
    if (path == nullptr) {
        dbgprint("GetAdapterFile(): failed to get path to file\n");
        return 0;
    }
    UniqueFile stream(std::fopen(path.get(), "r"));
    path.reset();
    if (stream == nullptr) {
        return 0;
    }
    return ReadAdapterFile(stream.get());
}

void XRefAdapterFile() {
    FileAdapters.BeginEnumeration();
    while (AdapterDescriptor* declared = FileAdapters.Next()) {
        const SlotDescriptor* slot = FirstInSlot(SlotList, declared->SlotID);
        if (slot == nullptr) {
            dbgprint("\n");
            dbgprint("    Error:  File:  \"%s\"\n", Widen(FileName).c_str());
            dbgprint("            Slot with ID %d not found\n",
                     static_cast<int32_t>(declared->SlotID));
            dbgprint("\n");
            continue;
        }
        declared->FriendlyNum = slot->FriendlyNum;
        declared->BusID = slot->BusID;
        declared->Bus = slot->BusNum;
        declared->Device = slot->DevNum;
    }
}

void MergeAdapterFile() {
    FileAdapters.BeginEnumeration();
    while (AdapterDescriptor* declared = FileAdapters.Next()) {
        AdapterDescriptor* target = FirstInSlot(AdapterList, declared->SlotID);
        if (target != nullptr) {
            declared->AdapterID = target->AdapterID;
            *target = *declared;
            continue;
        }
        std::unique_ptr<AdapterDescriptor> copy =
            NewObject<AdapterDescriptor>("MergeAdapterFile()");
        if (copy == nullptr) {
            continue;
        }
        declared->AdapterID = AdapterIndex++;
        *copy = *declared;
        AddOrReport(AdapterList, std::move(copy), "MergeAdapterFile()");
    }
}
