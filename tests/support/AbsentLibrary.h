#pragma once

namespace parvel::testing {

/// The library of a host that lacks it.
template <class Library>
const Library& absentLibrary() {
    static const Library library("libabsent.so.1");
    return library;
}

}  // namespace parvel::testing
