#pragma once

#include "tqr/plugin.h"

namespace ipmisel {

/// An array value of the host under construction; given back on every path.
class ValueArray {
public:
    /// get() is null when the host could not make one.
    ValueArray() {
        if (NQORTQR20::fdrNewCIMValueArray(&array_).code == NQORTQR20::kStatusFailed) {
            array_ = nullptr;
        }
    }
    ~ValueArray() { Delete(); }
    ValueArray(const ValueArray&) = delete;
    ValueArray& operator=(const ValueArray&) = delete;

    NQORTQR20::TCIMValueArray* get() const { return array_; }
    /// Gives the array back before the object ends.
    void Delete() {
        if (array_ != nullptr) NQORTQR20::fdrDeleteCIMValueArray(array_);
        array_ = nullptr;
    }

private:
    NQORTQR20::TCIMValueArray* array_ = nullptr;
};

}  // namespace ipmisel
