#pragma once

#include <cstring>
#include <stdexcept>

namespace ipmisel {

/// A library or a function of it is missing: one line that says so and what to install.
class SharedLibraryError : public std::runtime_error {
    using std::runtime_error::runtime_error;
};

/// A shared library that is loaded on use: who does not need it need not have it. It stays loaded,
/// since few are made to be unloaded.
class SharedLibrary {
public:
    /// `name` is its file, `product` what to install where it is missing: "SQLite 3 (package
    /// libsqlite3-0)". Both are kept as they are. Throws SharedLibraryError.
    SharedLibrary(const char* name, const char* product);
    /// Finds a function by its name and its type. Throws SharedLibraryError.
    template <typename Function>
    void Find(const char* function, Function** pointer) const {
        void* const found = Symbol(function);
        std::memcpy(pointer, &found, sizeof found);
    }

private:
    void* Symbol(const char* function) const;
    [[noreturn]] void Refuse() const;

    const char* name_;
    const char* product_;
    void* handle_;
};

}  // namespace ipmisel
