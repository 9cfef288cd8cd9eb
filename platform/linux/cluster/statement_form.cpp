#include "cluster/statement_form.h"

#include <algorithm>

namespace kelo::platform {
namespace {

using FormTokenKind = SqlToken::Kind;

std::string_view TakeElement(std::string_view &form) {
    const std::string_view element = form.substr(0, form.find(' '));
    form.remove_prefix(std::min(element.size() + 1, form.size()));
    return element;
}

bool TakeOrder(StatementTokens &tokens, FormValues &values) {
    if (!tokens.Is("order"))
        return true;
    if (!tokens.Is("by", 1) || !tokens.IsKind(FormTokenKind::kWord, 2))
        return false;
    tokens.MoveTo(tokens.Position() + 2);
    const std::string_view column = tokens.Take().text;
    if (!IsLogColumn(column)) {
        tokens.MoveTo(tokens.Position() - 1);
        return false;
    }
    values.orderColumn = LowerCase(column);
    values.isAscending = !tokens.Pass("desc");
    if (values.isAscending)
        tokens.Pass("asc");
    return true;
}

// A place that is not fixed.
bool TakeValue(StatementTokens &tokens, std::string_view place, FormValues &values) {
    if (place == "$where") {
        if (tokens.Pass("where"))
            values.where = ReadCondition(tokens);
        return true;
    }
    if (place == "$order")
        return TakeOrder(tokens, values);
    if (place == "$number") {
        if (!tokens.IsKind(FormTokenKind::kNumber) &&
            !(tokens.Is('-') && tokens.IsKind(FormTokenKind::kNumber, 1)))
            return false;
        values.values.push_back(ReadNumber(tokens));
        return true;
    }
    if (!tokens.IsKind(place == "$text" ? FormTokenKind::kString : FormTokenKind::kWord))
        return false;
    const SqlToken token = tokens.Take();
    if (place == "$column" && !IsLogColumn(token.text)) {
        tokens.MoveTo(tokens.Position() - 1);
        return false;
    }
    if (place == "$text")
        values.values.push_back(StringValue(token));
    else
        values.values.push_back(place == "$column" ? LowerCase(token.text) : std::string(token.text));
    return true;
}

} // namespace

bool HasForm(StatementTokens &tokens, std::string_view form, FormValues &values) {
    tokens.MoveTo(0);
    values = {};
    while (!form.empty()) {
        const std::string_view element = TakeElement(form);
        if (element[0] == '$' ? !TakeValue(tokens, element, values) : !tokens.Pass(element))
            return false;
    }
    return tokens.AtEnd();
}

} // namespace kelo::platform
