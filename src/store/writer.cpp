#include <span>

#include "common/failure.h"
#include "kelosyslog/dbwriter.h"
#include "store/store_connection.h"

SyslogDBWriter::SyslogDBWriter(std::string dbPath, const SyslogDBWriterOptions &options)
    : dbPath_(std::move(dbPath)), options_(options) {}

SyslogDBWriter::~SyslogDBWriter() = default;

int SyslogDBWriter::Open() {
    if (HasMoved())
        Close();
    if (connection_ != nullptr)
        return 0;
    if (!dbPath_.starts_with('/') || dbPath_.find('\0') != std::string::npos)
        return kelo::Fail(KELO_FAILURE_ARGUMENT, dbPath_, "SyslogDBWriter", "the path is not absolute");
    connection_ = kelo::StoreConnection::Open(dbPath_, options_);
    return connection_ != nullptr ? 0 : -1;
}

int SyslogDBWriter::Store(const _SYSLOG_LOG_DATA_tag *logs, size_t count, SyslogDBWriterCallback alongside,
                          void *context) {
    return Open() == 0 ? connection_->Store(std::span(logs, count), alongside, context) : -1;
}

int SyslogDBWriter::Store(const std::list<_SYSLOG_LOG_DATA_tag> &logs, SyslogDBWriterCallback alongside,
                          void *context) {
    return Open() == 0 ? connection_->Store(logs, alongside, context) : -1;
}

void SyslogDBWriter::Close() {
    connection_.reset();
}

bool SyslogDBWriter::HasMoved() const {
    return connection_ != nullptr && kelo::HasMoved(connection_->Get());
}

DBConnect_tag *SyslogDBWriter::ConnectionGet() const {
    return connection_ != nullptr ? connection_->Get() : nullptr;
}
