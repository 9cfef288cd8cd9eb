// Makes the database that bench/cluster measures with, and prints its path: make_text ROWS.

#include <cstdio>
#include <cstdlib>

#include "real_text.h"

int main(int argc, char **argv) {
    const int rows = argc == 2 ? std::atoi(argv[1]) : 0;
    if (rows <= 0) {
        std::fputs("usage: make_text ROWS\n", stderr);
        return 2;
    }
    std::puts(kelo::bench::RealTextDatabase(rows).c_str());
    return 0;
}
