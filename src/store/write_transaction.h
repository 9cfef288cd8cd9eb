#pragma once

#include <string>

struct DBConnect_tag;

namespace kelo {

// Runs a statement of which no rows are wanted. Returns 0, or -1 with the reason as the thread's last
// failure.
int RunStatement(DBConnect_tag *connection, const std::string &dbPath, const std::string &sql);

// Locks other writers out from Begin on. What was not committed at its end is rolled back, and the failure
// that led to that stays the last one.
class WriteTransaction {
public:
    // Both must outlive the transaction.
    WriteTransaction(DBConnect_tag *connection, const std::string &dbPath)
        : connection_(connection), dbPath_(dbPath) {}
    ~WriteTransaction();
    WriteTransaction(const WriteTransaction &) = delete;
    WriteTransaction &operator=(const WriteTransaction &) = delete;

    // Each returns 0 or -1.
    int Begin();
    int Commit();

private:
    DBConnect_tag *connection_;
    const std::string &dbPath_;
    bool isOpen_ = false;
};

} // namespace kelo
