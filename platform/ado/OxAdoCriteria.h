#pragma once

#include <functional>
#include <memory>
#include <string>
#include <vector>

#include "platform/core/OxExport.h"
#include "platform/core/OxVariant.h"

// The criteria of Find and Filter: comparisons "field op value" joined by AND and OR,
// with parentheses. Fields are names or [bracketed names]; values are numbers, 'texts'
// (a quote doubled inside), #dates#, TRUE, FALSE or NULL; the operators are = <> < > <=
// >= LIKE (with * or % for any run of characters) and IS [NOT] NULL. Texts compare
// without case. Parsing and binding raise adErrInvalidArgument for bad criteria and
// adErrItemNotFound for unknown fields.
class OX_EXPORT OxAdoCriteria {
public:
    enum class Op { Eq, Ne, Lt, Gt, Le, Ge, Like, IsNull, IsNotNull };

    struct Node {
        enum class Kind { Compare, And, Or } kind = Kind::Compare;
        // Compare
        std::wstring field;
        Op op = Op::Eq;
        enum class Literal { None, Null, Number, Text, Date, Bool } literal = Literal::None;
        std::wstring literalText;  // as written, without quotes or #
        int column = -1;           // after bind
        OxVariant bound;           // the literal in the column's terms
        // And / Or: two or more operands
        std::vector<std::unique_ptr<Node>> children;
    };

    // Parses the text; an empty text gives criteria that match everything.
    static OxAdoCriteria parse(const std::wstring& text);

    bool empty() const { return !m_root; }
    // True when the criteria are one comparison (Find takes no more).
    bool isSingleComparison() const;

    // Resolves field names to column positions and converts the literals to the columns'
    // data types. columnOf answers -1 for an unknown name.
    void bind(const std::function<int(const std::wstring&)>& columnOf,
              const std::function<int(int column)>& dataTypeOf);
    // Whether a row matches; value(i) gives the row's value of column i.
    bool matches(const std::function<const OxVariant&(int column)>& value) const;

    const Node* root() const { return m_root.get(); }

    // Orders two values for sorting and searching: NULL (and empty) first, numbers by
    // value, texts without case, dates by time, bytes by content. Values of different
    // kinds are compared as texts.
    static int compareValues(const OxVariant& a, const OxVariant& b);
    // Whether the text matches the pattern of LIKE (without case).
    static bool likeMatch(std::wstring_view text, std::wstring_view pattern);

private:
    std::unique_ptr<Node> m_root;
};
