// serial_object<T, Manager>: an object with a serial number within its manager, never reused.
#pragma once

#include <cstddef>
#include <vector>

// The manager's side: all objects by serial number; the slot of an object that was destroyed is null.
template <class T, class Manager>
class serial_namespace {
public:
    std::vector<T*> objects;
    void clear() { objects.clear(); }
};

template <class T, class Manager>
class serial_object {
public:
    const unsigned serial;
    Manager* const manager;

    serial_object(const serial_object&) = delete;
    serial_object& operator=(const serial_object&) = delete;

protected:
    // The object is entered while it is still being made, which is what the sanitizer's type check objects to: nobody
    // looks at it before its constructor is done.
    __attribute__((no_sanitize("vptr"))) explicit serial_object(Manager* owner)
        : serial(static_cast<unsigned>(owner->objects.size())), manager(owner) {
        owner->objects.push_back(static_cast<T*>(this));
    }
    ~serial_object() {
        if (serial < manager->objects.size()) manager->objects[serial] = nullptr;
    }
};
