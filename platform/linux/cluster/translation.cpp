#include "cluster/translation.h"

#include <algorithm>
#include <charconv>

#include "cluster/cluster_error.h"
#include "cluster/pattern.h"
#include "cluster/statement_form.h"

namespace kelo::platform {
namespace {

constexpr std::string_view kTables[] = {"logs", "histogram", "eps"};

// A statement with one answer. In the engine's text {logs} is the table and {where} the clause; {0}, {1} ...
// are the values of the form.
struct AnswerForm {
    std::string_view form;
    std::string_view engine;
    std::vector<std::string> columns; // also with {0}
};

// Histogram and samples of the accounting are sums over the rows.
const std::vector<AnswerForm> &AnswerForms() {
    static const std::vector<AnswerForm> forms = {
        {"select max ( rowid ) from logs", "SELECT count() FROM {logs}", {"max(rowid)"}},
        {"select max ( rowid ) from logs where ( msg glob '**' )",
         "SELECT count() FROM {logs}",
         {"max(rowid)"}},
        {"select count ( * ) from logs $where $order", "SELECT count() FROM {logs}{where}", {"COUNT(*)"}},
        {"select count ( * ) as $name from logs $where", "SELECT count() FROM {logs}{where}", {"{0}"}},
        {"select $column from logs group by $column order by $column asc",
         "SELECT {0} FROM {logs} GROUP BY {0} ORDER BY {0}",
         {"{0}"}},
        {"select distinct $column from logs",
         "SELECT {0} FROM {logs} GROUP BY {0} ORDER BY min(id)",
         {"{0}"}},
        {"select ( select min ( utcsec ) from logs ) as first , ( select max ( utcsec ) from logs ) as last",
         "SELECT min(utcsec), max(utcsec) FROM {logs} HAVING count() > 0",
         {"first", "last"}},
        {"select ( utcsec - ( $number ) ) / $number as span , prio , count ( * ) as number from logs $where "
         "group by 1 , 2",
         "SELECT intDiv(utcsec - ({0}), {1}) AS span, prio, count() FROM {logs}{where} GROUP BY span, prio "
         "ORDER BY span, prio",
         {"span", "prio", "number"}},
        {"select ( utcsec - ( $number ) ) / $number as value , llevel , count ( * ) as count from logs "
         "$where "
         "group by 1 , 2",
         "SELECT intDiv(utcsec - ({0}), {1}) AS value, llevel, count() FROM {logs}{where} GROUP BY value, "
         "llevel",
         {"value", "llevel", "count"}},
        {"select $column as value , llevel , count ( * ) as count from logs $where group by 1 , 2",
         "SELECT {0} AS value, llevel, count() FROM {logs}{where} GROUP BY value, llevel",
         {"value", "llevel", "count"}},
        {"select ifnull ( $column , '' ) as value , count ( * ) as count from logs $where group by 1 order "
         "by 2 "
         "desc , 1 limit $number offset $number",
         "SELECT {0} AS value, count() AS number FROM {logs}{where} GROUP BY value ORDER BY number DESC, "
         "value "
         "LIMIT {2}, {1}",
         {"value", "count"}},
        {"select ifnull ( $column , '' ) as value , count ( * ) as count from logs $where group by 1 order "
         "by 1 "
         "limit $number offset $number",
         "SELECT {0} AS value, count() FROM {logs}{where} GROUP BY value ORDER BY value LIMIT {2}, {1}",
         {"value", "count"}},
        {"select host , count ( * ) as number from logs $where group by host order by number desc , host",
         "SELECT host, count() AS number FROM {logs}{where} GROUP BY host ORDER BY number DESC, host",
         {"host", "number"}},
        {"select sum ( count ) from histogram", "SELECT count() FROM {logs}", {"SUM(count)"}},
        {"select * from histogram where device = $text",
         "SELECT host, count() FROM {logs} WHERE host = {0} GROUP BY host",
         {"device", "count"}},
        {"select * from histogram",
         "SELECT host, count() FROM {logs} GROUP BY host ORDER BY host",
         {"device", "count"}},
        {"select * from histogram order by count desc limit $number",
         "SELECT host, count() AS number FROM {logs} GROUP BY host ORDER BY number DESC, host LIMIT {0}",
         {"device", "count"}},
        {"select device , count from histogram limit 1",
         "SELECT host, 1 FROM {logs} LIMIT 1",
         {"device", "count"}},
        {"select * from eps where stamp >= $number and stamp <= $number",
         "SELECT utcsec, host, count() FROM {logs} WHERE {utcsec} GROUP BY utcsec, host ORDER BY utcsec, "
         "host",
         {"stamp", "device", "eps"}},
        {"select ( select min ( stamp ) from eps where stamp between $number and $number ) as first , ( "
         "select "
         "max ( stamp ) from eps where stamp between $number and $number ) as last , ( select device | | eps "
         "from eps limit 1 ) as probe",
         "SELECT min(utcsec), max(utcsec), '' FROM {logs} WHERE {utcsec} HAVING count() > 0",
         {"first", "last", "probe"}},
    };
    return forms;
}

void ReplaceAll(std::string &text, std::string_view from, const std::string &to) {
    for (size_t at = text.find(from); at != std::string::npos; at = text.find(from, at + to.size()))
        text.replace(at, from.size(), to);
}

// The places of a form that have a value, in their order.
std::vector<std::string_view> PlacesOf(std::string_view form) {
    std::vector<std::string_view> places;
    for (size_t at = form.find('$'); at != std::string_view::npos; at = form.find('$', at + 1)) {
        const std::string_view place = form.substr(at, form.find(' ', at) - at);
        if (place != "$where" && place != "$order")
            places.push_back(place);
    }
    return places;
}

// A range of times, as a condition that also limits the ids.
std::string TimeRange(const FormValues &values) {
    StatementTokens tokens("utcsec >= " + values.values[0] + " AND utcsec <= " + values.values[1]);
    return ReadCondition(tokens).text;
}

Translation Fill(const AnswerForm &answer, const FormValues &values, const std::string &table) {
    Translation translation{Translation::Kind::kAnswer, answer.columns, std::string(answer.engine)};
    std::string &sql = translation.sql;
    if (sql.find("{utcsec}") != std::string::npos)
        ReplaceAll(sql, "{utcsec}", TimeRange(values));
    const std::vector<std::string_view> places = PlacesOf(answer.form);
    for (size_t i = 0; i < values.values.size(); ++i) {
        const std::string place = "{" + std::to_string(i) + "}";
        ReplaceAll(sql, place, places[i] == "$text" ? EngineText(values.values[i]) : values.values[i]);
        ReplaceAll(translation.columns.front(), place, values.values[i]);
    }
    ReplaceAll(sql, "{logs}", table);
    ReplaceAll(sql, "{where}", values.where ? " WHERE " + values.where->text : "");
    translation.isCount32 =
        translation.columns.front() == "COUNT(*)" || translation.columns.front() == "max(rowid)";
    return translation;
}

// Whether the form has the same column in all places of one.
bool HasOneColumn(std::string_view form, const FormValues &values) {
    const std::vector<std::string_view> places = PlacesOf(form);
    const std::string *column = nullptr;
    for (size_t i = 0; i < places.size(); ++i) {
        if (places[i] != "$column")
            continue;
        if (column != nullptr && *column != values.values[i])
            return false;
        column = &values.values[i];
    }
    return true;
}

uint64_t UnsignedOf(const std::string &text) {
    uint64_t number = 0;
    std::from_chars(text.data(), text.data() + text.size(), number);
    return number;
}

Translation RowsOf(const FormValues &values) {
    Translation rows{Translation::Kind::kRows, LogColumns()};
    rows.where = values.where ? values.where->text : "1";
    rows.ids = values.where ? values.where->ids : RowIds();
    rows.orderColumn = values.orderColumn.empty() ? "id" : values.orderColumn;
    rows.isAscending = values.isAscending;
    return rows;
}

Translation PageByIdOf(const FormValues &values) {
    Translation page = RowsOf(values);
    page.kind = Translation::Kind::kPageById;
    page.columns.emplace_back("totalCount");
    page.offset = UnsignedOf(values.values[1]);
    const uint64_t end = UnsignedOf(values.values[0]);
    page.limit = end > page.offset ? end - page.offset : 0;
    return page;
}

constexpr std::string_view kPageForms[] = {
    "select * , ( select max ( rowid ) from logs ) totalcount from logs where ( id > totalcount - $number "
    "and "
    "id <= totalcount - $number ) $order",
    "select * , ( select max ( rowid ) from logs ) totalcount from logs where ( msg glob '**' ) and ( id > "
    "totalcount - $number and id <= totalcount - $number ) $order"};

// Throws that the statement is unknown from its token at `furthest` on.
[[noreturn]] void RefuseStatement(StatementTokens &tokens, size_t furthest) {
    tokens.MoveTo(0);
    if (tokens.Is("begin") || tokens.Is("rollback") || tokens.Is("commit"))
        throw ClusterError(KELO_FAILURE_STATEMENT, "a cluster has no transactions and no snapshots");
    while (!tokens.AtEnd()) {
        const bool isFrom = tokens.Is("from") || tokens.Is("into") || tokens.Is("update");
        tokens.Take();
        if (!isFrom || !tokens.IsKind(SqlToken::Kind::kWord))
            continue;
        const std::string table(tokens.Take().text);
        if (std::find(std::begin(kTables), std::end(kTables), table) == std::end(kTables))
            throw ClusterError(KELO_FAILURE_TABLE, "no such table: " + table);
    }
    tokens.MoveTo(furthest);
    tokens.RefuseRest("it is unknown");
}

} // namespace

const std::vector<std::string> &LogColumns() {
    static const std::vector<std::string> columns = {"id",     "host", "ip",     "fac",      "prio",
                                                     "llevel", "tag",  "utcsec", "tzoffset", "ldate",
                                                     "ltime",  "prog", "msg"};
    return columns;
}

Translation Translate(std::string_view sql, const std::string &database) {
    StatementTokens tokens(sql);
    FormValues values;
    size_t furthest = 0;
    const auto has = [&](std::string_view form) {
        const bool fits = HasForm(tokens, form, values);
        furthest = std::max(furthest, tokens.Position());
        return fits;
    };
    for (const std::string_view form : kPageForms) {
        if (has(form))
            return PageByIdOf(values);
    }
    for (const AnswerForm &answer : AnswerForms()) {
        if (has(answer.form) && HasOneColumn(answer.form, values))
            return Fill(answer, values, database + ".logs");
    }
    if (has("select * from logs $where $order"))
        return RowsOf(values);
    if (has("delete from logs $where")) {
        Translation deletion = RowsOf(values);
        deletion.kind = Translation::Kind::kDelete;
        return deletion;
    }
    RefuseStatement(tokens, furthest);
}

} // namespace kelo::platform
