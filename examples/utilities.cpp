// Splitting, numbers, quoting, reading a file from its end, and the debug channel.

#include <kelosyslog/debuger.h>
#include <kelosyslog/utils.h>
#include <syslog.h>

#include <array>
#include <cstdio>
#include <cstdlib>
#include <iostream>

int main(int argc, char **argv) {
    if (argc != 2)
        return 2;
    openlog("example", LOG_PERROR, LOG_USER);

    for (const std::string &piece : Tokenize("nas,,web1;web2", ",;")) // keeps empty pieces
        std::cout << "[" << piece << "]";
    std::cout << "\n" << ullNumberToString(18446744073709551615ULL) << "\n";

    std::array<char, 32> quoted;
    std::cout << EncodeJson(R"(say "C:\temp")", quoted.data(), quoted.size()) << ": " << quoted.data()
              << "\n";
    std::cout << "into 8 bytes: " << EncodeJson(R"(say "C:\temp")", quoted.data(), 8) << "\n";

    const std::string path = std::string(argv[1]) + "/messages";
    FILE *file = std::fopen(path.c_str(), "w+");
    if (file == nullptr)
        return 1;
    std::fputs("first\nsecond\nthird\nfourth", file);
    char **lines = nullptr;
    int count = 0;
    std::cout << "the last three: " << readfileinreverse(file, &lines, count, 3) << "\n";
    for (int i = 0; i < count; ++i) {
        std::cout << "  " << lines[i] << "\n";
        std::free(lines[i]); // the strings and the array are the caller's, also after a failure
    }
    std::free(lines);
    std::fclose(file);

    Debuger::MSG(0, "a failure is always written, 100% of it");
    Debuger::MSG(2, "a trace is dropped");
    Debuger::ThresholdSet(2); // for the whole process
    Debuger::MSG(2, "until a program asks for it");
}
