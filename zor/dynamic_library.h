// Libraries of the system, opened at run time.
#pragma once

namespace zor {

// A library that the system's loader finds under the name, or null. Bare names are searched in the system's own
// directories, never in the working directory.
void* openLibrary(const char* name) noexcept;
void closeLibrary(void* library) noexcept;

// The library's symbol, or null.
void* findSymbol(void* library, const char* name) noexcept;

// The symbol of that name among the libraries that the process has loaded for all to see, or null; always null on
// Windows, which has no such list.
void* findLoadedSymbol(const char* name) noexcept;

}  // namespace zor
