// Morphological antialiasing, after A. Reshetov, "Morphological Antialiasing" (2009), in the form for graphics hardware
// of J. Jimenez et al., "Practical Morphological Anti-Aliasing" (2011): find the edges between pixels, follow each edge
// to its ends, look up how much of the pixels beside it the true outline covers, and blend them by those areas.
//
// The shared texts follow; the three passes come after them, each built only with a definition of its own.

