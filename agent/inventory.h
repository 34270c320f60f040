// The inventories: the object lists encoded as Java arrays, one element per object, in list
// order. Each builder returns null when a JNI allocation fails; the Java exception that the
// failing call raised is left pending for the caller.
#pragma once

#include <jni.h>

#include <cstdint>

// Capacity of UTF16Buf in UTF-16 units: longer texts reach Java cut to this length.
constexpr int32_t UTF16_BUF_UNITS = 100;
extern jchar UTF16Buf[UTF16_BUF_UNITS];

// Element counts of the last acquisition; the inventories size their arrays by them.
extern int32_t BusInvCount;
extern int32_t SlotInvCount;
extern int32_t SystemInvCount;
extern int32_t AdapterInvCount;

// Recounts the four lists into the counts.
void CountInventories();

// Converts text into UTF16Buf, one unit per character (its low 16 bits), at most
// UTF16_BUF_UNITS; returns the number of units written.
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
