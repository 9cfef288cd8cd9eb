#include "random_search.h"

#include "keloplatform/gensqlregexp.h"

namespace kelo::test {
namespace {

std::string OtherCase(std::string text, Random &random) {
    for (char &byte : text) {
        if (random.OneIn(3) && ((byte >= 'a' && byte <= 'z') || (byte >= 'A' && byte <= 'Z')))
            byte ^= 0x20;
    }
    return text;
}

std::string Escaped(const std::string &text) {
    std::string escaped;
    for (const char byte : text) {
        if (std::string_view(R"(\^$.|?*+()[]{}/)").find(byte) != std::string_view::npos)
            escaped += '\\';
        escaped += byte;
    }
    return escaped;
}

std::string Regex(const std::string &text, Random &random) {
    const std::string literal = Escaped(text);
    const std::string other = Escaped(std::string(random.Of(kWords)));
    switch (random.Below(6)) {
    case 0:
        return "/" + literal + "/";
    case 1:
        return "/(" + literal + "|" + other + ")/";
    case 2:
        return "/" + literal + ".*[a-z]+" + other + "/";
    case 3:
        return "/(?i)" + literal + "\\d*/";
    case 4:
        return "/^(" + literal + ")?" + other + "{1,2}/";
    default:
        return "/(a|bc)(" + literal + "|[xyz]" + other + ")+/";
    }
}

std::string Term(const std::string &part, Random &random) {
    std::string text = random.OneIn(5) ? std::string(random.Of(kWords)) : part;
    if (random.OneIn(12))
        text = random.Of(kFoundInOddWords);
    if (random.OneIn(4))
        text = OtherCase(text, random);
    if (random.OneIn(5))
        return Regex(text, random);
    if (random.OneIn(4))
        return '"' + text + '"';
    if (random.OneIn(4))
        random.Of(text) = random.OneIn(2) ? '*' : '?';
    return text;
}

std::string Keyword(Random &random, const std::function<std::string()> &part) {
    std::string keyword;
    for (size_t terms = 1 + (random.OneIn(2) ? random.Below(3) : 0); terms > 0; --terms) {
        keyword += random.OneIn(6) ? "-" : "";
        keyword += Term(part(), random);
        keyword += terms == 1 ? "" : random.OneIn(3) ? " OR " : " ";
    }
    return keyword;
}

// Conditions as a caller writes them by hand.
_SYSLOG_SQL_COND_tag RandomCondition(Random &random, const std::function<std::string()> &part) {
    const std::string id = std::to_string(131'072 * 3 - 40'000 + random.Below(100'000));
    switch (random.Below(9)) {
    case 7:
        return {SYSLOG_ATTRI_UTCSEC,
                random.OneIn(2) ? SYSLOG_OP_GE : SYSLOG_OP_LE,
                std::to_string(1'600'000'000 + random.Below(200'000)),
                {}};
    case 8:
        return {SYSLOG_ATTRI_LLEVEL, SYSLOG_OP_EQ, "emerg", {{SYSLOG_ATTRI_FAC, SYSLOG_OP_EQ, "kern", {}}}};
    case 0:
        return {SYSLOG_ATTRI_MSG, SYSLOG_OP_LIKE, "*" + part() + "*", {}};
    case 1:
        return {SYSLOG_ATTRI_MSG, SYSLOG_OP_GLOB, "*" + part() + "*", {}};
    case 2:
        return {SYSLOG_ATTRI_MSG, SYSLOG_OP_NOT_LIKE, "*" + part() + "*", {}};
    case 3:
        return {SYSLOG_ATTRI_ID, random.OneIn(2) ? SYSLOG_OP_GE : SYSLOG_OP_LT, id, {}};
    case 4:
        return {SYSLOG_ATTRI_ID, random.OneIn(2) ? SYSLOG_OP_LE : SYSLOG_OP_GT, id, {}};
    case 5:
        return {SYSLOG_ATTRI_MSG,
                SYSLOG_OP_RAW,
                "NOT " + GenSQLRegexp(part(), "msg") + " OR " + GenSQLRegexp(part(), "msg"),
                {}};
    default:
        return {
            SYSLOG_ATTRI_HOST,
            SYSLOG_OP_EQ,
            "host1",
            {{SYSLOG_ATTRI_MSG, SYSLOG_OP_LIKE, part(), {}}, {SYSLOG_ATTRI_HOST, SYSLOG_OP_EQ, "host7", {}}}};
    }
}

} // namespace

RandomSearch MakeRandomSearch(Random &random, const std::function<std::string()> &part) {
    RandomSearch search;
    // What the index serves most often, and where nothing else hides a row that it leaves out.
    if (random.OneIn(3)) {
        search.conditions.push_back({SYSLOG_ATTRI_MSG, SYSLOG_OP_GLOB, "*" + part() + "*", {}});
        return search;
    }
    search.keyword = random.OneIn(10) ? "" : Keyword(random, part);
    const auto sometimes = [&](const char *text) { return random.OneIn(8) ? text : ""; };
    const std::string from = "2020/01/" + std::to_string(10 + random.Below(20));
    const std::string to = "2020/0" + std::to_string(1 + random.Below(3)) + "/15";
    LogSearchCondListGen(sometimes("host3,host5"), sometimes(random.OneIn(2) ? "emerg,crit" : "err"),
                         sometimes(random.OneIn(2) ? "kern" : "daemon,lpr"), sometimes("prog2"),
                         search.keyword, sometimes(from.c_str()), sometimes(to.c_str()), search.conditions);
    while (random.OneIn(4))
        search.conditions.push_back(RandomCondition(random, part));
    if (random.OneIn(2))
        search.order = _SYSLOG_SQL_ORDER_tag{random.OneIn(2) ? 1 : 0,
                                             random.OneIn(8) ? SYSLOG_ATTRI_HOST : SYSLOG_ATTRI_ID};
    if (random.OneIn(2))
        search.limit = _SYSLOG_SQL_LIMIT_tag{random.Below(60), random.OneIn(4) ? random.Below(500) : 0};
    return search;
}

} // namespace kelo::test
