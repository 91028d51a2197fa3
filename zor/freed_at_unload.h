// Memory that lives as long as the library: made at first use, freed when the library is unloaded or the host exits,
// and made anew for a host that calls from its own exit handlers after that.
#pragma once

// The pointer lies outside, for a compiler may drop what a destructor stores in its own object. Both are of namespace
// scope: no exit handler of a host then comes between the destruction of one owner and that of another.
template <class T>
struct FreedAtUnload {
    T*& pointer;

    ~FreedAtUnload() {
        delete pointer;
        pointer = nullptr;
    }
};
