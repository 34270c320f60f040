// New objects and list entries from the library's checked allocations: a failure is a null result
// and an error line from the function that asked.
#pragma once

#include <memory>
#include <new>

#include "diag/hwdebug.h"
#include "model/hwobjects.h"

// A new value-initialised T from the checked path, or null with an error line from function when
// memory runs out.
template <typename T>
std::unique_ptr<T> NewObject(const char* function) {
    std::unique_ptr<T> object(new (std::nothrow) T());
    if (object == nullptr) {
        ErrMsg(function, "malloc(%d) failed", static_cast<int>(sizeof(T)));
    }
    return object;
}

// Hands object to list (AddOwned); when the list has no memory for its entry the object is
// destroyed and function writes an error line. Returns the listed object or null.
template <typename T>
T* AddOrReport(ObjListTemp<T>& list, std::unique_ptr<T> object, const char* function) {
    T* listed = AddOwned(list, std::move(object));
    if (listed == nullptr) {
        ErrMsg(function, "list entry malloc() failed");
    }
    return listed;
}
