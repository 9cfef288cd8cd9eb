#pragma once

#include <array>
#include <map>
#include <string>
#include <string_view>
#include <vector>

#include "random_text.h"
#include "support/temp_root.h"

namespace kelo::test {

// A part of a message of a log database, "none" without one.
std::string RandomPartOfMessage(const std::string &database, Random &random);

// A log database to which everything happens that may happen to one, and to its index.
class RandomDatabase {
public:
    explicit RandomDatabase(Random &random);
    // One that exists, to which others may append and from which they may delete meanwhile.
    RandomDatabase(Random &random, const std::string &path);

    // Does one thing.
    void Change();
    const std::string &LastChange() const { return last_; }
    const std::map<std::string, size_t> &Changes() const { return changes_; }
    const std::string &Path() const { return path_; }
    // A part of a message that may be there.
    std::string PartOfMessage() { return RandomPartOfMessage(path_, random_); }

    // Checks the lines that this process wrote to the system log since the last call: only an index that was
    // made bad is reported, and each once. Returns what is wrong, "" for nothing.
    std::string CheckLines(const std::vector<std::string> &lines);
    size_t Lines() const { return lines_; }

private:
    struct Event;
    static const Event kEvents[];

    std::string Message();
    std::string Times();
    void Append(size_t count);
    void AppendSome();
    void Begin(const std::string &path, long long firstId);
    void Delete();
    void DeleteLittle();
    void Vacuum();
    void Replace();
    void Clear();
    void Copy();
    void CopyBack();
    void RenameBack();
    void BackUpBack();
    void DamageIndex();
    void ChangeVersion();
    void TakeOtherIndex();
    void RemoveIndex();
    void Build(int maxMs);
    void BuildPart() { Build(1); }
    void BuildAll() { Build(0); }
    void KillBuilder();
    void StarveBuilder();
    void BuildBesides();

    Random &random_;
    size_t time_ = 1'600'000'000;
    std::array<std::string_view, 3> topic_ = {"kernel", "disk", "sshd"}; // the words of the newest rows
    TempRoot root_;
    const bool isShared_;
    const std::string path_;
    const std::string copy_ = root_.File("copy.db");
    const std::string index_ = path_ + "-skip";
    std::string last_;
    std::map<std::string, size_t> changes_;
    size_t lines_ = 0;
    size_t linesOfOthers_ = 0; // since the last check
    bool mayBeBad_ = false;    // the index, or it is that of another state
    bool mustBeReported_ = false;
    bool isBuilt_ = false; // completely, since it was to be reported
};

} // namespace kelo::test
