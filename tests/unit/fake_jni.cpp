#include "fake_jni.h"

#include <algorithm>
#include <cstring>

FakeJni* FakeJni::current = nullptr;

FakeObject* FakeJni::New(int which, int failAt, FakeObject::Kind kind) {
    if (current->ExceptionPending) {
        ++current->CallsWithException;
    }
    if (++current->calls[which] == failAt) {
        current->ExceptionPending = true;
        return nullptr;
    }
    current->heap.push_back(std::make_unique<FakeObject>());
    current->heap.back()->kind = kind;
    current->PeakLocalRefs = std::max(current->PeakLocalRefs, ++current->LiveLocalRefs);
    return current->heap.back().get();
}

bool FakeJni::InBounds(jsize start, jsize length, size_t size) {
    if (current->ExceptionPending) {
        ++current->CallsWithException;
    }
    if (start >= 0 && length >= 0 && size_t(start) + size_t(length) <= size) {
        return true;
    }
    ++current->OutOfBounds;
    current->ExceptionPending = true;
    return false;
}

FakeJni::FakeJni() : previous(current) {
    using Kind = FakeObject::Kind;
    table.FindClass = [](JNIEnv*, const char* name) -> jclass {
        FakeObject* type = New(0, current->FailFindClass, Kind::Class);
        if (type != nullptr) {
            type->className = name;
        }
        return reinterpret_cast<jclass>(type);
    };
    table.GetObjectClass = [](JNIEnv*, jobject object) -> jclass {
        FakeObject* type = New(5, 0, Kind::Class);  // never fails
        type->className = Object(object)->kind == Kind::LongArray ? "[J" : "?";
        return reinterpret_cast<jclass>(type);
    };
    table.DeleteLocalRef = [](JNIEnv*, jobject object) {
        current->LiveLocalRefs -= object != nullptr ? 1 : 0;
    };
    table.ExceptionCheck = [](JNIEnv*) -> jboolean {
        return current->ExceptionPending ? JNI_TRUE : JNI_FALSE;
    };
    table.NewLongArray = [](JNIEnv*, jsize length) -> jlongArray {
        FakeObject* array = New(1, current->FailNewLongArray, Kind::LongArray);
        if (array != nullptr) {
            array->longs.assign(length, 0);
        }
        return reinterpret_cast<jlongArray>(array);
    };
    table.SetLongArrayRegion = [](JNIEnv*, jlongArray array, jsize start, jsize length,
                                  const jlong* values) {
        FakeObject* target = Object(array);
        if (InBounds(start, length, target->longs.size())) {
            std::copy(values, values + length, target->longs.begin() + start);
        }
    };
    table.NewObjectArray = [](JNIEnv*, jsize length, jclass type, jobject initial) {
        FakeObject* array = New(2, current->FailNewObjectArray, Kind::ObjectArray);
        if (array != nullptr) {
            array->className = "[" + Object(type)->className;
            array->elements.assign(length, Object(initial));
        }
        return reinterpret_cast<jobjectArray>(array);
    };
    table.SetObjectArrayElement = [](JNIEnv*, jobjectArray array, jsize index, jobject value) {
        FakeObject* target = Object(array);
        if (InBounds(index, 1, target->elements.size())) {
            target->elements[index] = Object(value);
        }
    };
    table.NewString = [](JNIEnv*, const jchar* units, jsize length) {
        FakeObject* text = New(3, current->FailNewString, Kind::String);
        if (text != nullptr) {
            text->text.assign(units, units + length);
        }
        return reinterpret_cast<jstring>(text);
    };
    table.NewStringUTF = [](JNIEnv*, const char* utf) {
        FakeObject* text = New(4, current->FailNewStringUTF, Kind::String);
        if (text != nullptr) {
            text->text.assign(utf, utf + std::strlen(utf));
        }
        return reinterpret_cast<jstring>(text);
    };
    env.functions = &table;
    current = this;
}

FakeJni::~FakeJni() {
    current = previous;
}
