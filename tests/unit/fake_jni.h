// A JNI environment without a JVM for the inventory builders: the few functions they use,
// objects kept in plain C++ records, chosen calls made to fail the way a JVM fails them (null
// and a pending exception), and the rule checks a JVM enforces with -Xcheck:jni.
#pragma once

#include <jni.h>

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

    FakeJni();
    ~FakeJni() { current = previous; }
    FakeJni(const FakeJni&) = delete;
    FakeJni& operator=(const FakeJni&) = delete;

    JNIEnv* Env() { return &env; }
    static FakeObject* Object(jobject reference) {
        return reinterpret_cast<FakeObject*>(reference);
    }

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
    static FakeJni* current;
    FakeJni* previous;
    JNINativeInterface_ table{};
    JNIEnv env{};
    std::vector<std::unique_ptr<FakeObject>> heap;
    int calls[Other + 1]{};

    // Counts a call; null for the call chosen to fail, else a new local reference.
    static FakeObject* New(Call which);
    // Stores outside the array raise the exception a JVM raises.
    static bool InBounds(jsize start, jsize length, size_t size);
};
