// A strict JSON reader for tests (RFC 8259): parses a whole document into a tree, or fails, so
// that a test both checks that the tool's output parses and reads values out of it.
#pragma once

#include <cctype>
#include <cstdint>
#include <cstdlib>
#include <map>
#include <memory>
#include <string>
#include <vector>

namespace vorcal::test {

struct Json {
    enum class Kind { Null, Bool, Number, String, Array, Object } kind = Kind::Null;
    std::string text; // string value, or the number as written
    bool b = false;
    std::vector<Json> items;
    std::map<std::string, Json> members;

    bool Has(const std::string &key) const { return members.count(key) != 0; }
    const Json &operator[](const std::string &key) const
    {
        static const Json kNull;
        const auto it = members.find(key);
        return it == members.end() ? kNull : it->second;
    }
    const Json &operator[](size_t i) const { return items.at(i); }
    int64_t Int() const { return std::strtoll(text.c_str(), nullptr, 10); }
    // A scalar as text, whatever its JSON type ("44100" and 44100 read the same).
    std::string Scalar() const { return kind == Kind::Bool ? (b ? "true" : "false") : text; }

    // Parses a whole document; false on any syntax error or trailing bytes.
    static bool Parse(const std::string &in, Json &out)
    {
        size_t pos = 0;
        return Value(in, pos, out, 0) && (Skip(in, pos), pos == in.size());
    }

private:
    static void Skip(const std::string &s, size_t &p)
    {
        while (p < s.size() && (s[p] == ' ' || s[p] == '\n' || s[p] == '\r' || s[p] == '\t'))
            ++p;
    }
    static bool Literal(const std::string &s, size_t &p, const char *word)
    {
        const std::string w = word;
        if (s.compare(p, w.size(), w) != 0)
            return false;
        p += w.size();
        return true;
    }
    static bool String(const std::string &s, size_t &p, std::string &out)
    {
        if (p >= s.size() || s[p] != '"')
            return false;
        for (++p; p < s.size(); ++p) {
            const unsigned char c = static_cast<unsigned char>(s[p]);
            if (c == '"') {
                ++p;
                return true;
            }
            if (c < 0x20)
                return false;
            if (c != '\\') {
                out += static_cast<char>(c);
                continue;
            }
            if (++p >= s.size())
                return false;
            switch (s[p]) {
            case '"': case '\\': case '/': out += s[p]; break;
            case 'b': out += '\b'; break;
            case 'f': out += '\f'; break;
            case 'n': out += '\n'; break;
            case 'r': out += '\r'; break;
            case 't': out += '\t'; break;
            case 'u': {
                if (p + 4 >= s.size())
                    return false;
                const std::string hex = s.substr(p + 1, 4);
                if (hex.find_first_not_of("0123456789abcdefABCDEF") != std::string::npos)
                    return false;
                const unsigned long u = std::strtoul(hex.c_str(), nullptr, 16);
                // UTF-8 of a BMP code point (the tool writes no surrogate pairs).
                if (u < 0x80) {
                    out += static_cast<char>(u);
                } else if (u < 0x800) {
                    out += static_cast<char>(0xC0 | (u >> 6));
                    out += static_cast<char>(0x80 | (u & 0x3F));
                } else {
                    out += static_cast<char>(0xE0 | (u >> 12));
                    out += static_cast<char>(0x80 | ((u >> 6) & 0x3F));
                    out += static_cast<char>(0x80 | (u & 0x3F));
                }
                p += 4;
                break;
            }
            default: return false;
            }
        }
        return false;
    }
    static bool Value(const std::string &s, size_t &p, Json &out, int depth)
    {
        Skip(s, p);
        if (p >= s.size() || depth > 64)
            return false;
        const char c = s[p];
        if (c == '{' || c == '[') {
            const bool bObject = c == '{';
            out.kind = bObject ? Kind::Object : Kind::Array;
            ++p;
            Skip(s, p);
            if (p < s.size() && s[p] == (bObject ? '}' : ']')) {
                ++p;
                return true;
            }
            for (;;) {
                std::string key;
                if (bObject) {
                    Skip(s, p);
                    if (!String(s, p, key))
                        return false;
                    Skip(s, p);
                    if (p >= s.size() || s[p++] != ':')
                        return false;
                }
                Json item;
                if (!Value(s, p, item, depth + 1))
                    return false;
                if (bObject)
                    out.members[key] = std::move(item);
                else
                    out.items.push_back(std::move(item));
                Skip(s, p);
                if (p < s.size() && s[p] == ',') {
                    ++p;
                    continue;
                }
                return p < s.size() && s[p++] == (bObject ? '}' : ']');
            }
        }
        if (c == '"') {
            out.kind = Kind::String;
            return String(s, p, out.text);
        }
        if (Literal(s, p, "true") || Literal(s, p, "false")) {
            out.kind = Kind::Bool;
            out.b = s[p - 1] == 'e' && s[p - 2] == 'u';
            return true;
        }
        if (Literal(s, p, "null"))
            return true;
        const size_t start = p;
        if (p < s.size() && s[p] == '-')
            ++p;
        while (p < s.size() && (std::isdigit(static_cast<unsigned char>(s[p])) || s[p] == '.' || s[p] == 'e' ||
                                s[p] == 'E' || s[p] == '+' || s[p] == '-'))
            ++p;
        if (p == start)
            return false;
        out.kind = Kind::Number;
        out.text = s.substr(start, p - start);
        return true;
    }
};

} // namespace vorcal::test
