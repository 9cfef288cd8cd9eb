#pragma once

// A folder of this process's own for files that a target reads, and what a fuzzer must not wait for or do.

#include <unistd.h>

#include <cstdlib>
#include <filesystem>
#include <fstream>
#include <string>

#include "quiet.h"

// The machine's disk.
extern "C" int fsync(int) {
    return 0;
}
extern "C" int fdatasync(int) {
    return 0;
}

inline const std::string &FuzzFolder() {
    struct Folder {
        Folder() {
            const char *parent = std::getenv("TMPDIR");
            path = std::string(parent != nullptr ? parent : "/dev/shm") + "/fuzz-XXXXXX";
            if (mkdtemp(path.data()) == nullptr)
                Fail("no folder", path);
        }
        ~Folder() {
            std::error_code ignored;
            std::filesystem::remove_all(path, ignored);
        }
        std::string path;
    };
    static const Folder folder;
    return folder.path;
}

inline void WriteFuzzFile(const std::string &path, const std::string &content) {
    std::ofstream(path, std::ios::binary | std::ios::trunc) << content;
}
