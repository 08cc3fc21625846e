#include "base/shared_library.h"

#include <dlfcn.h>

#include <string>

namespace ipmisel {

SharedLibrary::SharedLibrary(const char* name, const char* product)
    : name_(name), product_(product), handle_(dlopen(name, RTLD_NOW | RTLD_LOCAL)) {
    if (handle_ == nullptr) Refuse();
}

void* SharedLibrary::Symbol(const char* function) const {
    void* const found = dlsym(handle_, function);
    if (found == nullptr) Refuse();
    return found;
}

void SharedLibrary::Refuse() const {
    throw SharedLibraryError("the library " + std::string(name_) + " cannot be used (" + dlerror() +
                             "); install " + product_);
}

}  // namespace ipmisel
