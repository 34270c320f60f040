#include "fake_jni.h"

#include <algorithm>
#include <cstring>

FakeJni* FakeJni::current = nullptr;

FakeJni::FakeJni() : previous(current) {
    table.FindClass = FindClassImpl;
    table.GetObjectClass = GetObjectClassImpl;
    table.DeleteLocalRef = DeleteLocalRefImpl;
    table.ExceptionCheck = ExceptionCheckImpl;
    table.NewLongArray = NewLongArrayImpl;
    table.SetLongArrayRegion = SetLongArrayRegionImpl;
    table.NewObjectArray = NewObjectArrayImpl;
    table.SetObjectArrayElement = SetObjectArrayElementImpl;
    table.NewString = NewStringImpl;
    table.NewStringUTF = NewStringUTFImpl;
    env.functions = &table;
    current = this;
}

FakeJni::~FakeJni() {
    current = previous;
}

bool FakeJni::Fails(int& calls, int failAt) {
    ++calls;
    if (calls != failAt) {
        return false;
    }
    current->ExceptionPending = true;
    return true;
}

void FakeJni::Enter() {
    if (current->ExceptionPending) {
        ++current->CallsWithException;
    }
}

jobject FakeJni::NewLocal(std::unique_ptr<FakeObject> object) {
    current->heap.push_back(std::move(object));
    current->PeakLocalRefs = std::max(current->PeakLocalRefs, ++current->LiveLocalRefs);
    return reinterpret_cast<jobject>(current->heap.back().get());
}

jclass JNICALL FakeJni::FindClassImpl(JNIEnv*, const char* name) {
    Enter();
    if (Fails(current->findClassCalls, current->FailFindClass)) {
        return nullptr;
    }
    auto type = std::make_unique<FakeObject>();
    type->className = name;
    return static_cast<jclass>(NewLocal(std::move(type)));
}

jclass JNICALL FakeJni::GetObjectClassImpl(JNIEnv*, jobject object) {
    Enter();
    auto type = std::make_unique<FakeObject>();
    type->className = Object(object)->kind == FakeObject::Kind::LongArray ? "[J" : "?";
    return static_cast<jclass>(NewLocal(std::move(type)));
}

void JNICALL FakeJni::DeleteLocalRefImpl(JNIEnv*, jobject object) {
    if (object != nullptr) {
        --current->LiveLocalRefs;
    }
}

jboolean JNICALL FakeJni::ExceptionCheckImpl(JNIEnv*) {
    return current->ExceptionPending ? JNI_TRUE : JNI_FALSE;
}

jlongArray JNICALL FakeJni::NewLongArrayImpl(JNIEnv*, jsize length) {
    Enter();
    if (Fails(current->newLongArrayCalls, current->FailNewLongArray)) {
        return nullptr;
    }
    auto array = std::make_unique<FakeObject>();
    array->kind = FakeObject::Kind::LongArray;
    array->longs.assign(length, 0);
    return static_cast<jlongArray>(NewLocal(std::move(array)));
}

void JNICALL FakeJni::SetLongArrayRegionImpl(JNIEnv*, jlongArray array, jsize start, jsize length,
                                             const jlong* values) {
    Enter();
    FakeObject* target = Object(array);
    if (start < 0 || length < 0 ||
        static_cast<size_t>(start) + static_cast<size_t>(length) > target->longs.size()) {
        ++current->OutOfBounds;
        current->ExceptionPending = true;
        return;
    }
    std::copy(values, values + length, target->longs.begin() + start);
}

jobjectArray JNICALL FakeJni::NewObjectArrayImpl(JNIEnv*, jsize length, jclass elementClass,
                                                 jobject initial) {
    Enter();
    if (Fails(current->newObjectArrayCalls, current->FailNewObjectArray)) {
        return nullptr;
    }
    auto array = std::make_unique<FakeObject>();
    array->kind = FakeObject::Kind::ObjectArray;
    array->className = "[" + Object(elementClass)->className;
    array->elements.assign(length, Object(initial));
    return static_cast<jobjectArray>(NewLocal(std::move(array)));
}

void JNICALL FakeJni::SetObjectArrayElementImpl(JNIEnv*, jobjectArray array, jsize index,
                                                jobject value) {
    Enter();
    FakeObject* target = Object(array);
    if (index < 0 || static_cast<size_t>(index) >= target->elements.size()) {
        ++current->OutOfBounds;
        current->ExceptionPending = true;
        return;
    }
    target->elements[index] = Object(value);
}

jstring JNICALL FakeJni::NewStringImpl(JNIEnv*, const jchar* units, jsize length) {
    Enter();
    if (Fails(current->newStringCalls, current->FailNewString)) {
        return nullptr;
    }
    auto text = std::make_unique<FakeObject>();
    text->kind = FakeObject::Kind::String;
    text->text.assign(units, units + length);
    return static_cast<jstring>(NewLocal(std::move(text)));
}

jstring JNICALL FakeJni::NewStringUTFImpl(JNIEnv*, const char* utf) {
    Enter();
    if (Fails(current->newStringUtfCalls, current->FailNewStringUTF)) {
        return nullptr;
    }
    auto text = std::make_unique<FakeObject>();
    text->kind = FakeObject::Kind::String;
    text->text.assign(utf, utf + std::strlen(utf));
    return static_cast<jstring>(NewLocal(std::move(text)));
}
