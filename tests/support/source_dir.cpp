#include "support/source_dir.h"

// The only file that is compiled differently in every folder, so that a compiler cache serves all others.
const char *const kelo::test::kSourceFolder = KELO_SOURCE_DIR;
const char *const kelo::test::kBuildFolder = KELO_BUILD_DIR;
