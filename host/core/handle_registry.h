#pragma once

#include <algorithm>
#include <vector>

namespace tqrhost {

/// Base of the objects that the plug-in holds by pointer: knows which of them exist, so that a
/// handle that was given back or never was one is refused and not followed. There are only a few at
/// a time, and the newest is the one asked for.
template <typename T>
class HandleRegistry {
public:
    static bool Is(const T* object) {
        return object != nullptr && std::find(All().rbegin(), All().rend(), object) != All().rend();
    }

    HandleRegistry(const HandleRegistry&) = delete;
    HandleRegistry& operator=(const HandleRegistry&) = delete;

protected:
    HandleRegistry() { All().push_back(static_cast<const T*>(this)); }
    ~HandleRegistry() { std::erase(All(), static_cast<const T*>(this)); }

private:
    /// Never destroyed: a handle may outlive every other static object.
    static std::vector<const T*>& All() {
        static auto* const all = new std::vector<const T*>;
        return *all;
    }
};

}  // namespace tqrhost
