// A rollback journal beside a database may name a "super-journal", any file, which is deleted with it.
// Whoever can write to the folder of a database can put one there.

#include "support/program_test.h"

namespace kelo::test {
namespace {

constexpr uint32_t kPageBytes = 4096;

std::string BigEndian(uint32_t number) {
    std::string bytes;
    for (int shift = 24; shift >= 0; shift -= 8)
        bytes += static_cast<char>(number >> shift & 0xff);
    return bytes;
}

// The journal of a crash, which changes nothing when it is rolled back, and names the victim.
void WriteHotJournal(const std::string &database, const std::string &victim) {
    const std::string magic = "\xd9\xd5\x05\xf9\x20\xa1\x63\xd7";
    std::string journal = magic + BigEndian(0) + BigEndian(0) +
                          BigEndian(static_cast<uint32_t>(fs::file_size(database)) / kPageBytes) +
                          BigEndian(512) + BigEndian(kPageBytes);
    journal.resize(512);
    uint32_t sum = 0;
    for (const char byte : victim)
        sum += static_cast<uint32_t>(static_cast<signed char>(byte));
    journal += BigEndian((1U << 30) / kPageBytes + 1) + victim +
               BigEndian(static_cast<uint32_t>(victim.size())) + BigEndian(sum) + magic;
    WriteFile(database + "-journal", journal);
}

using SuperJournal = ProgramTest;

// The programs open databases in two ways, and each for reading and for writing.
TEST_F(SuperJournal, IsLeftAlone) {
    const std::string victim = root_.File("victim");
    for (const std::string &command : {std::string("search"), std::string("delete --all -y"),
                                       std::string("status"), "parse --db " + logs_}) {
        fs::remove(logs_);
        RunSql(logs_, ReadFile(BuildPath("package/schema/logs.sql")));
        WriteHotJournal(logs_, victim);
        WriteFile(victim, "precious");
        const ProgramResult result = Run(command);
        EXPECT_TRUE(fs::exists(victim)) << command << "\n" << result.out << result.err;
        EXPECT_FALSE(fs::exists(logs_ + "-journal")) << "it was no hot journal for " << command;
    }
}

} // namespace
} // namespace kelo::test
