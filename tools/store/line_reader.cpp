#include "store/line_reader.h"

#include <algorithm>

namespace kelo::tool {

void LineReader::StartAt(uint64_t offset, uint64_t lines) {
    offset_ = offset;
    number_ = lines;
}

bool LineReader::Next() {
    if (lineBytes_ == 0)
        kept_.clear();
    const size_t lineFeed = rest_.find('\n');
    const bool hasLineFeed = lineFeed != std::string_view::npos;
    const std::string_view piece = rest_.substr(0, lineFeed);
    rest_.remove_prefix(piece.size() + (hasLineFeed ? 1 : 0));
    lineBytes_ += piece.size();
    isOverlong_ = lineBytes_ > maxLineBytes_;
    if (!hasLineFeed && (!hasEnded_ || lineBytes_ == 0)) {
        Keep(piece);
        return false;
    }
    if (kept_.empty()) {
        line_ = isOverlong_ ? piece.substr(0, kOverlongHeadBytes) : piece;
    } else {
        Keep(piece);
        line_ = kept_;
    }
    offset_ += lineBytes_ + (hasLineFeed ? 1 : 0);
    ++number_;
    lineBytes_ = 0;
    return true;
}

void LineReader::Keep(std::string_view piece) {
    if (!isOverlong_) {
        kept_.append(piece);
        return;
    }
    kept_.resize(std::min(kept_.size(), kOverlongHeadBytes));
    kept_.append(piece.substr(0, kOverlongHeadBytes - kept_.size()));
}

} // namespace kelo::tool
