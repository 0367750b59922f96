// The library with one static constructor planted: library_exports_only must
// fail on it, stripped as what ships is.
#include <cstdlib>

static const bool planted = std::getenv("ORVANE_PLANTED") != nullptr;
bool PlantedConstructorRan() { return planted; }
