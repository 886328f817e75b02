#include "platform/ado/OxAdoCriteria.h"

#include <charconv>
#include <cmath>
#include <cstring>

#include "platform/ado/OxAdoDefs.h"
#include "platform/core/OxDateTime.h"
#include "platform/core/OxText.h"

namespace {
using Node = OxAdoCriteria::Node;
using Op = OxAdoCriteria::Op;
using Literal = Node::Literal;

// Nesting deeper than this is refused: criteria come from users, the stack must hold.
constexpr int kMaxDepth = 200;

[[noreturn]] void bad(const std::wstring& why) {
    OxAdo::raise(OxAdo::adErrInvalidArgument,
                 OxAdo::descriptionOf(OxAdo::adErrInvalidArgument) + L" (" + why + L")");
}

struct Token {
    enum class Type { End, LParen, RParen, Word, Name, Text, Date, Op } type = Type::End;
    std::wstring text;
};

bool isBlank(wchar_t c) {
    return c == L' ' || c == L'\t' || c == L'\r' || c == L'\n';
}

bool isWordChar(wchar_t c) {
    return !isBlank(c) && c != L'(' && c != L')' && c != L'=' && c != L'<' && c != L'>' &&
           c != L'!' && c != L'\'' && c != L'#' && c != L'[' && c != L'"';
}

class Lexer {
public:
    explicit Lexer(const std::wstring& text) : m_text(text) {}

    Token next() {
        while (m_pos < m_text.size() && isBlank(m_text[m_pos])) ++m_pos;
        Token t;
        if (m_pos >= m_text.size())
            return t;
        const wchar_t c = m_text[m_pos];
        if (c == L'(') {
            ++m_pos;
            t.type = Token::Type::LParen;
        } else if (c == L')') {
            ++m_pos;
            t.type = Token::Type::RParen;
        } else if (c == L'\'' || c == L'"') {
            t.type = Token::Type::Text;
            t.text = quoted(c);
        } else if (c == L'#') {
            t.type = Token::Type::Date;
            const size_t end = m_text.find(L'#', m_pos + 1);
            if (end == std::wstring::npos)
                bad(L"unterminated date");
            t.text = m_text.substr(m_pos + 1, end - m_pos - 1);
            m_pos = end + 1;
        } else if (c == L'[') {
            t.type = Token::Type::Name;
            const size_t end = m_text.find(L']', m_pos + 1);
            if (end == std::wstring::npos)
                bad(L"unterminated field name");
            t.text = m_text.substr(m_pos + 1, end - m_pos - 1);
            m_pos = end + 1;
        } else if (c == L'=' || c == L'<' || c == L'>' || c == L'!') {
            t.type = Token::Type::Op;
            t.text = c;
            ++m_pos;
            if (m_pos < m_text.size()) {
                const wchar_t d = m_text[m_pos];
                if ((c == L'<' && (d == L'>' || d == L'=')) || (c == L'>' && d == L'=') ||
                    (c == L'!' && d == L'=')) {
                    t.text += d;
                    ++m_pos;
                }
            }
            if (t.text == L"!")
                bad(L"unknown operator !");
        } else {
            t.type = Token::Type::Word;
            const size_t start = m_pos;
            while (m_pos < m_text.size() && isWordChar(m_text[m_pos])) ++m_pos;
            t.text = m_text.substr(start, m_pos - start);
        }
        return t;
    }

private:
    std::wstring quoted(wchar_t quote) {
        std::wstring out;
        ++m_pos;
        while (m_pos < m_text.size()) {
            if (m_text[m_pos] == quote) {
                if (m_pos + 1 < m_text.size() && m_text[m_pos + 1] == quote) {
                    out += quote;
                    m_pos += 2;
                    continue;
                }
                ++m_pos;
                return out;
            }
            out += m_text[m_pos++];
        }
        bad(L"unterminated text");
    }

    const std::wstring& m_text;
    size_t m_pos = 0;
};

bool isKeyword(const Token& t, const wchar_t* word) {
    return t.type == Token::Type::Word && OxText::equalsNoCase(t.text, word);
}

class Parser {
public:
    explicit Parser(const std::wstring& text) : m_lexer(text) { advance(); }

    std::unique_ptr<Node> parseAll() {
        auto node = orExpr(0);
        if (m_tok.type != Token::Type::End)
            bad(L"unexpected " + m_tok.text);
        return node;
    }

private:
    void advance() { m_tok = m_lexer.next(); }

    // Operands of one operator are kept side by side, so long chains never nest.
    std::unique_ptr<Node> orExpr(int depth) {
        auto node = andExpr(depth);
        if (!isKeyword(m_tok, L"OR"))
            return node;
        auto group = std::make_unique<Node>();
        group->kind = Node::Kind::Or;
        group->children.push_back(std::move(node));
        while (isKeyword(m_tok, L"OR")) {
            advance();
            group->children.push_back(andExpr(depth));
        }
        return group;
    }

    std::unique_ptr<Node> andExpr(int depth) {
        auto node = primary(depth);
        if (!isKeyword(m_tok, L"AND"))
            return node;
        auto group = std::make_unique<Node>();
        group->kind = Node::Kind::And;
        group->children.push_back(std::move(node));
        while (isKeyword(m_tok, L"AND")) {
            advance();
            group->children.push_back(primary(depth));
        }
        return group;
    }

    std::unique_ptr<Node> primary(int depth) {
        if (depth > kMaxDepth)
            bad(L"criteria nested too deeply");
        if (m_tok.type == Token::Type::LParen) {
            advance();
            auto node = orExpr(depth + 1);
            if (m_tok.type != Token::Type::RParen)
                bad(L"missing )");
            advance();
            return node;
        }
        return comparison();
    }

    std::unique_ptr<Node> comparison() {
        auto n = std::make_unique<Node>();
        if (m_tok.type != Token::Type::Word && m_tok.type != Token::Type::Name)
            bad(L"field name expected");
        if (m_tok.type == Token::Type::Word &&
            (isKeyword(m_tok, L"AND") || isKeyword(m_tok, L"OR")))
            bad(L"field name expected");
        n->field = m_tok.text;
        advance();
        if (isKeyword(m_tok, L"IS")) {
            advance();
            bool negate = false;
            if (isKeyword(m_tok, L"NOT")) {
                negate = true;
                advance();
            }
            if (!isKeyword(m_tok, L"NULL"))
                bad(L"NULL expected after IS");
            advance();
            n->op = negate ? Op::IsNotNull : Op::IsNull;
            return n;
        }
        if (isKeyword(m_tok, L"LIKE")) {
            n->op = Op::Like;
        } else if (m_tok.type == Token::Type::Op) {
            const std::wstring& o = m_tok.text;
            n->op = o == L"="                    ? Op::Eq
                    : (o == L"<>" || o == L"!=") ? Op::Ne
                    : o == L"<"                  ? Op::Lt
                    : o == L">"                  ? Op::Gt
                    : o == L"<="                 ? Op::Le
                                                 : Op::Ge;
        } else {
            bad(L"operator expected after " + n->field);
        }
        advance();
        switch (m_tok.type) {
            case Token::Type::Text:
                n->literal = Literal::Text;
                break;
            case Token::Type::Date:
                n->literal = Literal::Date;
                break;
            case Token::Type::Word:
                if (isKeyword(m_tok, L"NULL"))
                    n->literal = Literal::Null;
                else if (isKeyword(m_tok, L"TRUE") || isKeyword(m_tok, L"FALSE"))
                    n->literal = Literal::Bool;
                else
                    n->literal = Literal::Number;
                break;
            default:
                bad(L"value expected after the operator");
        }
        n->literalText = m_tok.text;
        advance();
        if (n->literal == Literal::Null) {
            if (n->op == Op::Eq)
                n->op = Op::IsNull;
            else if (n->op == Op::Ne)
                n->op = Op::IsNotNull;
            else
                bad(L"NULL takes = or <>");
        }
        return n;
    }

    Lexer m_lexer;
    Token m_tok;
};

// A number written in criteria, read the same whatever the user's locale.
bool parseNumber(const std::wstring& text, OxVariant& out) {
    const std::wstring t = OxText::trim(text);
    if (t.empty() || t.size() > 64)
        return false;
    std::string ascii;
    for (wchar_t c : t) {
        if (c > 0x7F)
            return false;
        ascii += static_cast<char>(c);
    }
    const char* first = ascii.data();
    const char* last = first + ascii.size();
    if (*first == '+')
        ++first;
    long long i = 0;
    auto ri = std::from_chars(first, last, i);
    if (ri.ec == std::errc() && ri.ptr == last) {
        out = OxVariant(i);
        return true;
    }
    double d = 0;
    auto rd = std::from_chars(first, last, d);
    if (rd.ec == std::errc() && rd.ptr == last && std::isfinite(d)) {
        out = OxVariant(d);
        return true;
    }
    return false;
}

enum class Kind { Null, Number, Text, Date, Bytes };

Kind kindOf(const OxVariant& v) {
    switch (v.vt()) {
        case VT_EMPTY:
        case VT_NULL:
            return Kind::Null;
        case VT_BSTR:
            return Kind::Text;
        case VT_DATE:
            return Kind::Date;
        case VT_ARRAY | VT_UI1:
            return Kind::Bytes;
        default:
            return Kind::Number;
    }
}

bool integral(const OxVariant& v, long double& out) {
    switch (v.vt()) {
        case VT_I1:
            out = v.cVal();
            return true;
        case VT_I2:
            out = v.iVal();
            return true;
        case VT_BOOL:
            // True sorts after false.
            out = v.boolVal() ? 1 : 0;
            return true;
        case VT_I4:
        case VT_INT:
            out = v.lVal();
            return true;
        case VT_I8:
            out = static_cast<long double>(v.llVal());
            return true;
        case VT_UI1:
            out = v.bVal();
            return true;
        case VT_UI2:
            out = v.uiVal();
            return true;
        case VT_UI4:
        case VT_UINT:
            out = v.ulVal();
            return true;
        case VT_UI8:
            out = static_cast<long double>(v.ullVal());
            return true;
        default:
            return false;
    }
}

long double numberOf(const OxVariant& v) {
    long double n = 0;
    if (integral(v, n))
        return n;
    switch (v.vt()) {
        case VT_R4:
            return v.fltVal();
        case VT_R8:
        case VT_DATE:
            return v.dblVal();
        case VT_CY:
            return static_cast<long double>(v.cyVal()) / 10000.0L;
        default: {
            OxVariant d;
            if (!OxHr::failed(v.tryChangeType(VT_R8, d)))
                return d.dblVal();
            return 0;
        }
    }
}

template <class T>
int sign(T a, T b) {
    return a < b ? -1 : (b < a ? 1 : 0);
}

std::wstring textOf(const OxVariant& v) {
    if (v.vt() == VT_BSTR)
        return v.str();
    OxVariant t;
    if (!OxHr::failed(v.tryChangeType(VT_BSTR, t)))
        return t.str();
    return {};
}

bool likeAt(std::wstring_view text, size_t ti, std::wstring_view pattern, size_t pi, int& budget) {
    // Iterative on single characters, recursive only at a wildcard; the budget bounds the
    // work on patterns with many wildcards.
    while (pi < pattern.size()) {
        const wchar_t p = pattern[pi];
        if (p == L'*' || p == L'%') {
            while (pi < pattern.size() && (pattern[pi] == L'*' || pattern[pi] == L'%')) ++pi;
            if (pi == pattern.size())
                return true;
            for (size_t k = ti; k <= text.size(); ++k) {
                if (--budget < 0)
                    return false;
                if (likeAt(text, k, pattern, pi, budget))
                    return true;
            }
            return false;
        }
        if (ti >= text.size() || OxText::toLower(text[ti]) != OxText::toLower(p))
            return false;
        ++ti;
        ++pi;
    }
    return ti == text.size();
}

OxVariant bindLiteral(const Node& n, int dataType) {
    using namespace OxAdo;
    const std::wstring& text = n.literalText;
    if (isBinaryType(dataType))
        bad(L"binary field " + n.field + L" compares with NULL only");
    if (n.op == Op::Like)
        return OxVariant(text);
    if (isTextType(dataType))
        return OxVariant(text);
    if (dataType == adGUID) {
        std::wstring g = OxText::trim(text);
        if (!g.empty() && g.front() != L'{')
            g = L"{" + g + L"}";
        return OxVariant(g);
    }
    const uint16_t vt = variantTypeOf(dataType);
    if (vt == VT_DATE) {
        double serial = 0;
        OxVariant number;
        if (n.literal != Literal::Date && n.literal != Literal::Text && parseNumber(text, number))
            return OxVariant::fromDate(number.changedType(VT_R8).dblVal());
        if (OxHr::failed(OxDateTime::parse(text, serial)))
            bad(L"not a date: " + text);
        return OxVariant::fromDate(serial);
    }
    if (vt == VT_BOOL) {
        if (OxText::equalsNoCase(text, L"TRUE") || OxText::equalsNoCase(text, L"YES"))
            return OxVariant(true);
        if (OxText::equalsNoCase(text, L"FALSE") || OxText::equalsNoCase(text, L"NO"))
            return OxVariant(false);
        OxVariant number;
        if (!parseNumber(text, number))
            bad(L"not a boolean: " + text);
        return OxVariant(numberOf(number) != 0);
    }
    if (vt == VT_EMPTY) {
        // A field of no known type compares with what was written.
        OxVariant number;
        if (n.literal == Literal::Number && parseNumber(text, number))
            return number;
        return OxVariant(text);
    }
    OxVariant number;
    if (n.literal == Literal::Bool)
        return OxVariant(static_cast<long long>(OxText::equalsNoCase(text, L"TRUE") ? -1 : 0));
    if (!parseNumber(text, number))
        bad(L"not a number: " + text);
    return number;
}

void bindNode(Node& n, const std::function<int(const std::wstring&)>& columnOf,
              const std::function<int(int)>& dataTypeOf) {
    if (n.kind != Node::Kind::Compare) {
        for (auto& child : n.children) bindNode(*child, columnOf, dataTypeOf);
        return;
    }
    n.column = columnOf(n.field);
    if (n.column < 0)
        OxAdo::raise(OxAdo::adErrItemNotFound);
    if (n.op != Op::IsNull && n.op != Op::IsNotNull)
        n.bound = bindLiteral(n, dataTypeOf(n.column));
}

bool evalNode(const Node& n, const std::function<const OxVariant&(int)>& value) {
    switch (n.kind) {
        case Node::Kind::And:
            for (const auto& child : n.children)
                if (!evalNode(*child, value))
                    return false;
            return true;
        case Node::Kind::Or:
            for (const auto& child : n.children)
                if (evalNode(*child, value))
                    return true;
            return false;
        case Node::Kind::Compare:
            break;
    }
    const OxVariant& v = value(n.column);
    const bool isNull = v.isNull() || v.isEmpty();
    if (n.op == Op::IsNull)
        return isNull;
    if (n.op == Op::IsNotNull)
        return !isNull;
    if (isNull)
        return false;
    if (n.op == Op::Like)
        return OxAdoCriteria::likeMatch(textOf(v), n.bound.bstr());
    const int c = OxAdoCriteria::compareValues(v, n.bound);
    switch (n.op) {
        case Op::Eq:
            return c == 0;
        case Op::Ne:
            return c != 0;
        case Op::Lt:
            return c < 0;
        case Op::Gt:
            return c > 0;
        case Op::Le:
            return c <= 0;
        case Op::Ge:
            return c >= 0;
        default:
            return false;
    }
}
}  // namespace

OxAdoCriteria OxAdoCriteria::parse(const std::wstring& text) {
    OxAdoCriteria c;
    if (OxText::trim(text).empty())
        return c;
    c.m_root = Parser(text).parseAll();
    return c;
}

bool OxAdoCriteria::isSingleComparison() const {
    return m_root && m_root->kind == Node::Kind::Compare;
}

void OxAdoCriteria::bind(const std::function<int(const std::wstring&)>& columnOf,
                         const std::function<int(int)>& dataTypeOf) {
    if (m_root)
        bindNode(*m_root, columnOf, dataTypeOf);
}

bool OxAdoCriteria::matches(const std::function<const OxVariant&(int)>& value) const {
    return !m_root || evalNode(*m_root, value);
}

int OxAdoCriteria::compareValues(const OxVariant& a, const OxVariant& b) {
    const Kind ka = kindOf(a);
    const Kind kb = kindOf(b);
    if (ka == Kind::Null || kb == Kind::Null)
        return sign(ka == Kind::Null ? 0 : 1, kb == Kind::Null ? 0 : 1);
    const bool numericA = ka == Kind::Number || ka == Kind::Date;
    const bool numericB = kb == Kind::Number || kb == Kind::Date;
    if (numericA && numericB) {
        long double ia = 0, ib = 0;
        if (integral(a, ia) && integral(b, ib) && a.vt() == VT_I8 && b.vt() == VT_I8)
            return sign(a.llVal(), b.llVal());
        return sign(numberOf(a), numberOf(b));
    }
    if (ka == Kind::Bytes && kb == Kind::Bytes) {
        const size_t n = std::min(a.bytesSize(), b.bytesSize());
        const int c = n ? std::memcmp(a.bytesData(), b.bytesData(), n) : 0;
        return c != 0 ? (c < 0 ? -1 : 1) : sign(a.bytesSize(), b.bytesSize());
    }
    const int c = OxText::compareNoCase(textOf(a), textOf(b));
    return c < 0 ? -1 : (c > 0 ? 1 : 0);
}

bool OxAdoCriteria::likeMatch(std::wstring_view text, std::wstring_view pattern) {
    int budget = 1 << 20;
    return likeAt(text, 0, pattern, 0, budget);
}
