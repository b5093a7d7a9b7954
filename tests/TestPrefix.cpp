// Compiled for the precompiled header of the tests, which comes out beside it.
