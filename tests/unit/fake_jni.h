// A JNI environment without a JVM for the inventory builders: the few functions they use,
// objects kept in plain C++ records, chosen calls made to fail the way a JVM fails them (null
// and a pending exception), and the rule checks a JVM enforces with -Xcheck:jni.
#pragma once

#include <jni.h>

#include <algorithm>
#include <cstring>
#include <memory>
#include <string>
#include <vector>

struct FakeObject {
    std::vector<jlong> longs;
    std::vector<FakeObject*> elements;
    std::u16string text;
};

class FakeJni {
  public:
    enum Call { FindClass, NewLongArray, NewObjectArray, NewString, NewStringUTF, Other };

    FakeJni() : previous(current) {
        table.FindClass = [](JNIEnv*, const char*) {
            return reinterpret_cast<jclass>(New(FindClass));
        };
        table.GetObjectClass = [](JNIEnv*, jobject) {
            return reinterpret_cast<jclass>(New(Other));
        };
        table.DeleteLocalRef = [](JNIEnv*, jobject ref) { current->LiveLocalRefs -= ref ? 1 : 0; };
        table.ExceptionCheck = [](JNIEnv*) -> jboolean { return current->ExceptionPending; };
        table.NewLongArray = [](JNIEnv*, jsize length) {
            return reinterpret_cast<jlongArray>(
                New(NewLongArray, [&](FakeObject& array) { array.longs.assign(length, 0); }));
        };
        table.SetLongArrayRegion = [](JNIEnv*, jlongArray array, jsize start, jsize length,
                                      const jlong* values) {
            if (InBounds(start, length, Object(array)->longs.size())) {
                std::copy(values, values + length, Object(array)->longs.begin() + start);
            }
        };
        table.NewObjectArray = [](JNIEnv*, jsize length, jclass, jobject initial) {
            return reinterpret_cast<jobjectArray>(New(NewObjectArray, [&](FakeObject& array) {
                array.elements.assign(length, Object(initial));
            }));
        };
        table.SetObjectArrayElement = [](JNIEnv*, jobjectArray array, jsize index, jobject value) {
            if (InBounds(index, 1, Object(array)->elements.size())) {
                Object(array)->elements[index] = Object(value);
            }
        };
        table.NewString = [](JNIEnv*, const jchar* units, jsize length) {
            return reinterpret_cast<jstring>(
                New(NewString, [&](FakeObject& text) { text.text.assign(units, units + length); }));
        };
        table.NewStringUTF = [](JNIEnv*, const char* utf) {
            return reinterpret_cast<jstring>(New(NewStringUTF, [&](FakeObject& text) {
                text.text.assign(utf, utf + std::strlen(utf));
            }));
        };
        env.functions = &table;
        current = this;
    }
    ~FakeJni() { current = previous; }

    JNIEnv* Env() { return &env; }
    static FakeObject* Object(jobject ref) { return reinterpret_cast<FakeObject*>(ref); }

    // The nth call (counting from 1) of the function fails; 0: none does.
    int FailAt[Other + 1]{};
    bool ExceptionPending = false;
    // Calls other than DeleteLocalRef made while an exception was pending.
    int CallsWithException = 0;
    // Element stores outside the array, which a JVM answers with an exception.
    int OutOfBounds = 0;
    int LiveLocalRefs = 0;
    int PeakLocalRefs = 0;

  private:
    static inline FakeJni* current = nullptr;
    FakeJni* previous;
    JNINativeInterface_ table{};
    JNIEnv env{};
    std::vector<std::unique_ptr<FakeObject>> heap;
    int calls[Other + 1]{};

    // Counts a call; null for the call chosen to fail, else a new local reference.
    template <typename Init = void (*)(FakeObject&)>
    static FakeObject* New(
        Call which, Init init = [](FakeObject&) {}) {
        current->CallsWithException += current->ExceptionPending ? 1 : 0;
        if (++current->calls[which] == current->FailAt[which]) {
            current->ExceptionPending = true;
            return nullptr;
        }
        current->heap.push_back(std::make_unique<FakeObject>());
        current->PeakLocalRefs = std::max(current->PeakLocalRefs, ++current->LiveLocalRefs);
        init(*current->heap.back());
        return current->heap.back().get();
    }

    // Stores outside the array raise the exception a JVM raises.
    static bool InBounds(jsize start, jsize length, size_t size) {
        current->CallsWithException += current->ExceptionPending ? 1 : 0;
        if (start >= 0 && length >= 0 && size_t(start) + size_t(length) <= size) {
            return true;
        }
        ++current->OutOfBounds;
        current->ExceptionPending = true;
        return false;
    }
};
