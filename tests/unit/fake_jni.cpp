#include "fake_jni.h"

#include <algorithm>
#include <cstring>

FakeJni* FakeJni::current = nullptr;

FakeObject* FakeJni::New(Call which) {
    current->CallsWithException += current->ExceptionPending ? 1 : 0;
    if (++current->calls[which] == current->FailAt[which]) {
        current->ExceptionPending = true;
        return nullptr;
    }
    current->heap.push_back(std::make_unique<FakeObject>());
    current->PeakLocalRefs = std::max(current->PeakLocalRefs, ++current->LiveLocalRefs);
    return current->heap.back().get();
}

bool FakeJni::InBounds(jsize start, jsize length, size_t size) {
    current->CallsWithException += current->ExceptionPending ? 1 : 0;
    if (start >= 0 && length >= 0 && size_t(start) + size_t(length) <= size) {
        return true;
    }
    ++current->OutOfBounds;
    current->ExceptionPending = true;
    return false;
}

FakeJni::FakeJni() : previous(current) {
    table.FindClass = [](JNIEnv*, const char*) { return reinterpret_cast<jclass>(New(FindClass)); };
    table.GetObjectClass = [](JNIEnv*, jobject) { return reinterpret_cast<jclass>(New(Other)); };
    table.DeleteLocalRef = [](JNIEnv*, jobject object) {
        current->LiveLocalRefs -= object != nullptr ? 1 : 0;
    };
    table.ExceptionCheck = [](JNIEnv*) -> jboolean { return current->ExceptionPending; };
    table.NewLongArray = [](JNIEnv*, jsize length) {
        FakeObject* array = New(NewLongArray);
        if (array != nullptr) {
            array->longs.assign(length, 0);
        }
        return reinterpret_cast<jlongArray>(array);
    };
    table.SetLongArrayRegion = [](JNIEnv*, jlongArray array, jsize start, jsize length,
                                  const jlong* values) {
        if (InBounds(start, length, Object(array)->longs.size())) {
            std::copy(values, values + length, Object(array)->longs.begin() + start);
        }
    };
    table.NewObjectArray = [](JNIEnv*, jsize length, jclass, jobject initial) {
        FakeObject* array = New(NewObjectArray);
        if (array != nullptr) {
            array->elements.assign(length, Object(initial));
        }
        return reinterpret_cast<jobjectArray>(array);
    };
    table.SetObjectArrayElement = [](JNIEnv*, jobjectArray array, jsize index, jobject value) {
        if (InBounds(index, 1, Object(array)->elements.size())) {
            Object(array)->elements[index] = Object(value);
        }
    };
    table.NewString = [](JNIEnv*, const jchar* units, jsize length) {
        FakeObject* text = New(NewString);
        if (text != nullptr) {
            text->text.assign(units, units + length);
        }
        return reinterpret_cast<jstring>(text);
    };
    table.NewStringUTF = [](JNIEnv*, const char* utf) {
        FakeObject* text = New(NewStringUTF);
        if (text != nullptr) {
            text->text.assign(utf, utf + std::strlen(utf));
        }
        return reinterpret_cast<jstring>(text);
    };
    env.functions = &table;
    current = this;
}
