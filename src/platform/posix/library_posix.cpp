// Loading the shared object runs nothing of the library's own beyond its
// constant initialisers; there is no entry point to write here.
