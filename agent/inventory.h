// The inventories: the object lists encoded as Java arrays, one element per object, in list
// order. Each builder returns null when a JNI allocation fails; the Java exception that the
// failing call raised is left pending for the caller.
#pragma once

#include <jni.h>

#include <cstdint>

// Longer texts reach Java cut to this many characters; a decoded character may take two
// UTF-16 units, hence the capacity of UTF16Buf.
constexpr int32_t UTF16_MAX_CHARS = 100;
constexpr int32_t UTF16_BUF_UNITS = 2 * UTF16_MAX_CHARS;
extern jchar UTF16Buf[UTF16_BUF_UNITS];

// Element counts of the last acquisition; the inventories size their arrays by them.
extern int32_t BusInvCount;
extern int32_t SlotInvCount;
extern int32_t SystemInvCount;
extern int32_t AdapterInvCount;

// Recounts the four lists into the counts.
void CountInventories();

// Converts at most UTF16_MAX_CHARS characters of text into UTF16Buf (TextToUtf16: UTF-8 is
// decoded, other text goes over one unit per character); returns the number of units written.
int WcharToUnicode(const wchar_t* text);
// Writes one numeric element to the JNI-side log: "*" and the low 32 bits as a signed decimal
// per value, then a newline.
void PrintNumInv(const jlong* values, int count);

jobjectArray BusNumInv(JNIEnv* env);
jobjectArray SlotNumInv(JNIEnv* env);
jobjectArray SystemNumInv(JNIEnv* env);
jobjectArray AdapterNumInv(JNIEnv* env);

jobjectArray SystemNameInv(JNIEnv* env);
jobjectArray AdapterNameInv(JNIEnv* env);
jobjectArray AdapterPciIdInv(JNIEnv* env);
jobjectArray AdapterDriverInv(JNIEnv* env);
