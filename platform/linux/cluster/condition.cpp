#include "cluster/condition.h"

#include <algorithm>
#include <charconv>
#include <optional>

#include "cluster/cluster_error.h"
#include "cluster/pattern.h"

namespace kelo::platform {
namespace {

using TokenKind = SqlToken::Kind;

constexpr std::string_view kColumns[] = {"id",     "host",     "ip",    "fac",   "prio", "llevel", "tag",
                                         "utcsec", "tzoffset", "ldate", "ltime", "prog", "msg"};
constexpr int kMaxDepth = 500;

// Whether the text is a number of 64 bits with a sign.
bool IsNumber(const std::optional<std::string> &text, int64_t &number) {
    if (!text)
        return false;
    const auto [end, error] = std::from_chars(text->data(), text->data() + text->size(), number);
    return error == std::errc() && end == text->data() + text->size();
}

// A value in the engine's language.
struct Operand {
    enum class Type { kText, kNumber, kPosition, kCondition } type;
    std::string sql;
    std::optional<std::string> literal = {}; // the value, of a text or number that is no column
    RowIds ids = {};                         // of a condition
};
using Type = Operand::Type;

// Reads an expression by recursive descent; from the loosest operator to the tightest.
class ConditionReader {
public:
    explicit ConditionReader(StatementTokens &tokens) : tokens_(tokens) {}

    Condition Read() {
        const Operand operand = AsCondition(Or());
        return {operand.sql, operand.ids};
    }

private:
    Operand Or() {
        if (++depth_ > kMaxDepth)
            tokens_.RefuseRest("conditions that are nested too deep");
        Operand operand = And();
        while (tokens_.Pass("or")) {
            operand = AsCondition(std::move(operand));
            const Operand other = AsCondition(And());
            operand = {Type::kCondition, operand.sql + " OR " + other.sql, {}, operand.ids.Or(other.ids)};
        }
        --depth_;
        return operand;
    }

    Operand And() {
        Operand operand = Not();
        while (tokens_.Pass("and")) {
            operand = AsCondition(std::move(operand));
            const Operand other = AsCondition(Not());
            operand = {Type::kCondition, operand.sql + " AND " + other.sql, {}, operand.ids.And(other.ids)};
        }
        return operand;
    }

    Operand Not() {
        if (!tokens_.Pass("not"))
            return Comparison();
        if (++depth_ > kMaxDepth)
            tokens_.RefuseRest("conditions that are nested too deep");
        const Operand operand = AsCondition(Not());
        --depth_;
        return {Type::kCondition, "NOT (" + operand.sql + ")"};
    }

    Operand Comparison() {
        Operand left = Primary();
        if (tokens_.Pass("is"))
            return Is(left, tokens_.Pass("not"));
        if (tokens_.Is("not") && (tokens_.Is("like", 1) || tokens_.Is("glob", 1) ||
                                  tokens_.Is("between", 1) || tokens_.Is("in", 1))) {
            tokens_.Take();
            return {Type::kCondition, "NOT (" + WordOperator(left).sql + ")"};
        }
        if (tokens_.Is("like") || tokens_.Is("glob") || tokens_.Is("between") || tokens_.Is("in"))
            return WordOperator(left);
        const std::string symbol = TakeOperator();
        return symbol.empty() ? left : Compare(left, symbol, Primary());
    }

    // "" if there is none.
    std::string TakeOperator() {
        constexpr struct {
            std::string_view first, second;
            const char *engine;
        } kOperators[] = {{"<=", "", "<="}, {">=", "", ">="}, {"<", ">", "!="}, {"!", "=", "!="},
                          {"=", "=", "="},  {"=", "", "="},   {"<", "", "<"},   {">", "", ">"}};
        for (const auto &known : kOperators) {
            if (!tokens_.Is(known.first) || (!known.second.empty() && !tokens_.Is(known.second, 1)))
                continue;
            tokens_.Take();
            if (!known.second.empty())
                tokens_.Take();
            return known.engine;
        }
        return "";
    }

    Operand Compare(const Operand &left, const std::string &symbol, const Operand &right) {
        const std::string text = left.sql + " " + symbol + " " + right.sql;
        if (left.type == Type::kPosition && symbol == ">" && right.literal == "0")
            return {Type::kCondition, text};
        RequireAlike(left, right);
        int64_t number = 0;
        if (!IsNumber(right.literal, number))
            return {Type::kCondition, text};
        if (left.sql == "id")
            return {Type::kCondition, text, {}, IdsBy(symbol, number, number)};
        if (left.sql == "utcsec")
            return WithIds(text, IdsBy(symbol, FirstIdOfSecond(number), LastIdOfSecond(number)));
        return {Type::kCondition, text};
    }

    static int64_t LastIdOfSecond(int64_t second) {
        return FirstIdOfSecond(second) + (int64_t{1} << kBitsBelowSecond) - 1;
    }

    // The ids that such a comparison can be true for, if its value has the ids from `first` to `last`.
    static RowIds IdsBy(const std::string &symbol, int64_t first, int64_t last) {
        RowIds ids;
        if (symbol == "=" || symbol == ">" || symbol == ">=")
            ids.first = std::max<int64_t>(first, 0);
        if (symbol == "=" || symbol == "<" || symbol == "<=")
            ids.last = last;
        return ids;
    }

    // A condition on a time also as one on the ids, which are in the order in which the engine stores rows.
    static Operand WithIds(const std::string &text, const RowIds &ids) {
        std::string both = "(" + text;
        if (ids.first > 0)
            both += " AND id >= " + std::to_string(ids.first);
        if (ids.last != RowIds().last)
            both += " AND id <= " + std::to_string(ids.last);
        return {Type::kCondition, both + ")", {}, ids};
    }

    // Columns hold no NULL.
    Operand Is(const Operand &left, bool isNot) {
        if (tokens_.Pass("null"))
            return {Type::kCondition, isNot ? "1" : "0"};
        return Compare(left, isNot ? "!=" : "=", Primary());
    }

    Operand WordOperator(const Operand &left) {
        if (tokens_.Pass("between")) {
            const Operand from = Primary();
            if (!tokens_.Pass("and"))
                tokens_.RefuseRest("no AND of a BETWEEN");
            const Operand first = Compare(left, ">=", from);
            const Operand last = Compare(left, "<=", Primary());
            return {
                Type::kCondition, "(" + first.sql + " AND " + last.sql + ")", {}, first.ids.And(last.ids)};
        }
        if (tokens_.Pass("in"))
            return In(left);
        if (left.type != Type::kText)
            tokens_.RefuseRest("a pattern for what is no text,");
        const bool isLike = tokens_.Take().Is("like");
        const std::string pattern = StringLiteral();
        if (!isLike)
            return {Type::kCondition, GlobCondition(left.sql, pattern)};
        const bool hasEscape = tokens_.Pass("escape");
        if (hasEscape && StringLiteral() != "\\")
            tokens_.RefuseRest("an escape character other than the backslash");
        return {Type::kCondition, LikeCondition(left.sql, pattern, hasEscape)};
    }

    Operand In(const Operand &left) {
        Expect('(');
        std::string list;
        RowIds ids{RowIds().last, 0};
        bool isIdList = left.sql == "id";
        do {
            const Operand value = Primary();
            RequireAlike(left, value);
            int64_t id = 0;
            isIdList = IsNumber(value.literal, id) && isIdList;
            ids = ids.Or({id, id});
            list.append(list.empty() ? "" : ", ").append(value.sql);
        } while (tokens_.Pass(','));
        Expect(')');
        return {Type::kCondition, left.sql + " IN (" + list + ")", {}, isIdList ? ids : RowIds()};
    }

    Operand Primary() {
        if (tokens_.Pass('(')) {
            Operand inside = Or();
            Expect(')');
            inside.sql = "(" + inside.sql + ")";
            return inside;
        }
        if (tokens_.IsKind(TokenKind::kString)) {
            const std::string value = StringLiteral();
            return {Type::kText, EngineText(value), value};
        }
        if (tokens_.IsKind(TokenKind::kNumber) || tokens_.Is('-')) {
            const std::string number = ReadNumber(tokens_);
            return {Type::kNumber, number, number};
        }
        if (!tokens_.IsKind(TokenKind::kWord))
            tokens_.RefuseRest("no value");
        if (tokens_.Is('(', 1))
            return Call();
        return Column();
    }

    Operand Column() {
        const std::string name = LowerCase(tokens_.Take().text);
        if (!IsLogColumn(name))
            throw ClusterError(KELO_FAILURE_COLUMN, "no such column: " + name);
        return {IsNumberColumn(name) ? Type::kNumber : Type::kText, name};
    }

    Operand Call() {
        const size_t start = tokens_.Position();
        const std::string name = LowerCase(tokens_.Take().text);
        Expect('(');
        if (name == "lower") {
            const Operand text = Text();
            Expect(')');
            return {Type::kText, "lower(" + text.sql + ")"};
        }
        if (name == "instr") {
            const Operand text = Text();
            Expect(',');
            const std::string part = StringLiteral();
            Expect(')');
            return {Type::kPosition, "position(" + text.sql + ", " + EngineText(part) + ")"};
        }
        if (name == "regexp" || name == "regexpi") {
            const std::string regex = StringLiteral();
            Expect(',');
            const Operand text = Text();
            Expect(')');
            return {Type::kCondition, RegexCondition(text.sql, regex, name == "regexpi")};
        }
        if (name == "ifnull") { // never NULL
            const Operand value = AsCondition(Or());
            Expect(',');
            ReadNumber(tokens_);
            Expect(')');
            return {Type::kCondition, "(" + value.sql + ")", {}, value.ids};
        }
        tokens_.MoveTo(start);
        tokens_.RefuseRest("an unknown function");
    }

    Operand Text() {
        Operand operand = Primary();
        if (operand.type != Type::kText)
            tokens_.RefuseRest("a function of a text has a value that is none");
        return operand;
    }

    std::string StringLiteral() {
        if (!tokens_.IsKind(TokenKind::kString))
            tokens_.RefuseRest("no text in quotation marks");
        return StringValue(tokens_.Take());
    }

    void Expect(char symbol) {
        if (!tokens_.Pass(symbol))
            tokens_.RefuseRest(std::string("no '") + symbol + "'");
    }

    // A number is true unless it is zero.
    Operand AsCondition(Operand operand) {
        if (operand.type == Type::kCondition)
            return operand;
        if (operand.type == Type::kNumber && operand.literal)
            return {Type::kCondition, *operand.literal == "0" ? "0" : "1"};
        tokens_.RefuseRest("a value in the place of a condition,");
    }

    void RequireAlike(const Operand &left, const Operand &right) {
        const bool areValues = left.type == Type::kText || left.type == Type::kNumber;
        if (!areValues || left.type != right.type)
            tokens_.RefuseRest("a comparison of different kinds of values ends");
    }

    StatementTokens &tokens_;
    int depth_ = 0;
};

} // namespace

Condition ReadCondition(StatementTokens &tokens) {
    return ConditionReader(tokens).Read();
}

bool IsLogColumn(std::string_view word) {
    return std::find(std::begin(kColumns), std::end(kColumns), LowerCase(word)) != std::end(kColumns);
}

bool IsNumberColumn(std::string_view word) {
    const std::string name = LowerCase(word);
    return name == "id" || name == "utcsec";
}

std::string ReadNumber(StatementTokens &tokens) {
    const bool isNegative = tokens.Pass('-');
    const bool isNumber = tokens.IsKind(TokenKind::kNumber) && !tokens.Is('.', 1);
    uint64_t number = 0;
    if (isNumber) {
        const std::string_view digits = tokens.Take().text;
        const auto [end, error] = std::from_chars(digits.begin(), digits.end(), number);
        if (error == std::errc() && end == digits.end())
            return (isNegative && number != 0 ? "-" : "") + std::to_string(number);
        tokens.MoveTo(tokens.Position() - 1);
    }
    tokens.RefuseRest("no whole number of 64 bits");
}

} // namespace kelo::platform
