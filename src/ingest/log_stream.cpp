#include <algorithm>

#include "common/failure.h"
#include "kelosyslog/debuger.h"
#include "kelosyslog/logparser.h"

LogStream::LogStream(LogParser &parser, size_t maxLineBytes)
    : parser_(parser), maxLineBytes_(std::max<size_t>(maxLineBytes, 1)) {}

void LogStream::Add(std::string_view piece) {
    // In parts of this size a line within one part is short enough.
    for (; !piece.empty(); piece.remove_prefix(std::min(piece.size(), maxLineBytes_)))
        TakePart(piece.substr(0, maxLineBytes_));
}

void LogStream::TakePart(std::string_view piece) {
    const size_t firstLineFeed = piece.find('\n');
    addedBytes_ += piece.size();
    openLineBytes_ += piece.size();
    Keep(piece.substr(0, firstLineFeed));
    if (firstLineFeed == std::string_view::npos)
        return;
    const size_t lastLineFeed = piece.rfind('\n');
    ParseLines(piece.substr(firstLineFeed, lastLineFeed + 1 - firstLineFeed));
    openLineBytes_ = piece.size() - lastLineFeed - 1;
    Keep(piece.substr(lastLineFeed + 1));
}

void LogStream::Finish() {
    ParseLines({});
    openLineBytes_ = 0;
}

uint64_t LogStream::TakenBytes() const {
    return addedBytes_ - openLineBytes_;
}

uint64_t LogStream::OverlongCount() const {
    return overlongCount_;
}

// Parses the waiting line, which ends here, and the complete `lines` after it.
void LogStream::ParseLines(std::string_view lines) {
    std::string text(lines);
    if (!waiting_.empty() || !text.empty()) {
        parser_.PartialLogSet(std::move(waiting_));
        parser_.LogAdd(text);
        parser_.PartialLogSet({});
    }
    waiting_.clear();
    isSkipping_ = false;
}

// Appends to the waiting line, or drops the line once it is too long.
void LogStream::Keep(std::string_view part) {
    if (isSkipping_)
        return;
    if (part.size() <= maxLineBytes_ - waiting_.size()) {
        waiting_.append(part);
        return;
    }
    waiting_ = {};
    isSkipping_ = true;
    ++overlongCount_;
    kelo::Fail(KELO_FAILURE_FORMAT, "", part, "the line is longer than allowed");
    Debuger::MSG(0, "Fail to parse log");
}
