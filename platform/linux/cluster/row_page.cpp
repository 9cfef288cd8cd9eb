// Rows of a page. The engine reads in the order of ids only in later versions, so the ids of a page are
// looked for first, in windows of time that grow, and then the rows that have them.

#include <algorithm>
#include <ctime>

#include "cluster/cluster.h"

namespace kelo::platform {
namespace {

// The largest page whose ids are looked for first; they all have to fit into one statement.
constexpr uint64_t kMostIds = 5000;
// Windows from now backwards, in seconds; then all rows.
constexpr int64_t kWindowsSec[] = {600, 86400, 864000};

std::string Join(const std::vector<std::string> &names) {
    std::string text;
    for (const std::string &name : names)
        text.append(text.empty() ? "" : ", ").append(name);
    return text;
}

std::string Join(const std::vector<uint64_t> &numbers) {
    std::string text;
    for (const uint64_t number : numbers)
        text.append(text.empty() ? "" : ",").append(std::to_string(number));
    return text;
}

std::string OrderText(const Translation &rows) {
    const char *direction = rows.isAscending ? "" : " DESC";
    if (rows.orderColumn == "id")
        return std::string(" ORDER BY id") + direction;
    return " ORDER BY " + rows.orderColumn + direction + ", id";
}

// The lower ends of the windows that a search for the newest rows goes through.
std::vector<int64_t> LowerEnds(const RowIds &ids) {
    std::vector<int64_t> ends;
    const int64_t newest = std::min<int64_t>(std::time(nullptr), ids.last >> kBitsBelowSecond);
    for (const int64_t window : kWindowsSec) {
        const int64_t end = FirstIdOfSecond(newest - window);
        if (end > ids.first)
            ends.push_back(end);
    }
    ends.push_back(std::max<int64_t>(ids.first, 0));
    return ends;
}

} // namespace

std::vector<uint64_t> Cluster::IdsOfPage(const Translation &rows, const Page &page) {
    const uint64_t needed = page.limit + page.offset;
    const std::string select = "SELECT id FROM " + Table() + " WHERE ";
    const std::string end = " AND (" + rows.where + ")" + OrderText(rows) + " LIMIT ";
    std::vector<uint64_t> ids;
    std::string below; // what was looked through
    for (const int64_t first :
         rows.isAscending ? std::vector{std::max<int64_t>(rows.ids.first, 0)} : LowerEnds(rows.ids)) {
        const std::vector<uint64_t> found = AskNumbers(select + "id >= " + std::to_string(first) + below +
                                                       end + std::to_string(needed - ids.size()));
        ids.insert(ids.end(), found.begin(), found.end());
        if (ids.size() >= needed)
            break;
        below = " AND id < " + std::to_string(first);
    }
    ids.erase(ids.begin(), ids.begin() + static_cast<ptrdiff_t>(std::min<uint64_t>(page.offset, ids.size())));
    return ids;
}

void Cluster::TakeRows(const Translation &rows, const std::vector<uint64_t> &ids, RowTaker &taker,
                       const std::string &furtherColumn) {
    taker.TakeColumns(rows.columns);
    if (ids.empty())
        return;
    const auto [first, last] = std::minmax(ids.front(), ids.back());
    Ask("SELECT " + Join(LogColumns()) + furtherColumn + " FROM " + Table() +
            " WHERE id >= " + std::to_string(first) + " AND id <= " + std::to_string(last) + " AND id IN (" +
            Join(ids) + ")" + OrderText(rows),
        rows.columns.size(), taker);
}

void Cluster::RunRows(const Translation &rows, const Page &page, RowTaker &taker) {
    const bool isByIds = rows.orderColumn == "id" && page.limit != 0 && page.limit + page.offset <= kMostIds;
    if (isByIds)
        return TakeRows(rows, IdsOfPage(rows, page), taker);
    taker.TakeColumns(rows.columns);
    Ask("SELECT " + Join(rows.columns) + " FROM " + Table() + " WHERE " + rows.where + OrderText(rows) +
            page.Clause(),
        rows.columns.size(), taker);
}

// With dense ids, those above the number of all rows less the end of the page.
void Cluster::RunPageById(const Translation &page, RowTaker &taker) {
    const uint64_t total = AskNumber("SELECT count() FROM " + Table());
    Translation newest = page;
    newest.where = "1";
    newest.ids = {};
    newest.orderColumn = "id";
    newest.isAscending = false;
    const std::vector<uint64_t> ids =
        page.limit == 0 ? std::vector<uint64_t>() : IdsOfPage(newest, {page.limit, page.offset});
    TakeRows(page, ids, taker, ", " + std::to_string(total));
}

} // namespace kelo::platform
