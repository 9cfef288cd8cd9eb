#pragma once

#include <array>
#include <string>
#include <string_view>

#include "random_text.h"
#include "support/temp_root.h"

namespace kelo::test {

// A part of a message of a log database, "none" without one.
std::string RandomPartOfMessage(const std::string &database, Random &random);

// A log database to which everything happens that may happen to one, and to its index.
class RandomDatabase {
public:
    explicit RandomDatabase(Random &random);

    // Does one thing; returns what.
    std::string Change();
    const std::string &Path() const { return path_; }
    // A part of a message that may be there.
    std::string PartOfMessage() { return RandomPartOfMessage(path_, random_); }

private:
    std::string ChangeSomething();
    std::string Message();
    std::string Times();
    void Append(size_t count);
    void Begin(const std::string &path, long long firstId);
    void Delete();
    void Replace();
    void Restore(bool inPlace);
    void DamageIndex();

    Random &random_;
    size_t time_ = 1'600'000'000;
    std::array<std::string_view, 3> topic_ = {"kernel", "disk", "sshd"}; // the words of the newest rows
    TempRoot root_;
    const std::string path_ = root_.File("logs.db");
    const std::string copy_ = root_.File("copy.db");
    std::string index_ = path_ + "-skip";
};

} // namespace kelo::test
