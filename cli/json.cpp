#include "json.hpp"

#include <cinttypes>

namespace vorcal::cli {

namespace {

// Length of the valid UTF-8 sequence at p (1-4), or 0 when it is not one (overlong forms,
// surrogates and code points above U+10FFFF included), RFC 3629 section 4.
size_t Utf8Length(const unsigned char *p, size_t uLeft)
{
    const unsigned c = p[0];
    size_t n = 0;
    unsigned lo = 0x80, hi = 0xBF;
    if (c >= 0xC2 && c <= 0xDF) {
        n = 2;
    } else if (c >= 0xE0 && c <= 0xEF) {
        n = 3;
        lo = c == 0xE0 ? 0xA0 : 0x80;
        hi = c == 0xED ? 0x9F : 0xBF;
    } else if (c >= 0xF0 && c <= 0xF4) {
        n = 4;
        lo = c == 0xF0 ? 0x90 : 0x80;
        hi = c == 0xF4 ? 0x8F : 0xBF;
    } else {
        return 0;
    }
    if (uLeft < n || p[1] < lo || p[1] > hi)
        return 0;
    for (size_t i = 2; i < n; ++i)
        if (p[i] < 0x80 || p[i] > 0xBF)
            return 0;
    return n;
}

} // namespace

JsonWriter::~JsonWriter()
{
    if (stack_.empty() && !bAfterKey_)
        std::fputc('\n', pOut_);
}

void JsonWriter::WriteEscaped(std::FILE *pOut, std::string_view value)
{
    std::fputc('"', pOut);
    const auto *p = reinterpret_cast<const unsigned char *>(value.data());
    for (size_t i = 0; i < value.size();) {
        const unsigned c = p[i];
        if (c == '"' || c == '\\') {
            std::fputc('\\', pOut);
            std::fputc(static_cast<int>(c), pOut);
        } else if (c == '\n') {
            std::fputs("\\n", pOut);
        } else if (c == '\t') {
            std::fputs("\\t", pOut);
        } else if (c == '\r') {
            std::fputs("\\r", pOut);
        } else if (c < 0x20 || c == 0x7F) {
            std::fprintf(pOut, "\\u%04x", c);
        } else if (c < 0x80) {
            std::fputc(static_cast<int>(c), pOut);
        } else if (const size_t n = Utf8Length(p + i, value.size() - i)) {
            std::fwrite(p + i, 1, n, pOut);
            i += n;
            continue;
        } else {
            std::fputs("\\ufffd", pOut);
        }
        ++i;
    }
    std::fputc('"', pOut);
}

void JsonWriter::NewLine()
{
    std::fputc('\n', pOut_);
    for (size_t i = 0; i < stack_.size(); ++i)
        std::fputs("  ", pOut_);
}

void JsonWriter::BeforeValue()
{
    if (bAfterKey_) {
        bAfterKey_ = false;
        return;
    }
    if (stack_.empty())
        return;
    if (!stack_.back().bEmpty)
        std::fputc(',', pOut_);
    stack_.back().bEmpty = false;
    NewLine();
}

JsonWriter &JsonWriter::Key(std::string_view key)
{
    BeforeValue();
    WriteEscaped(pOut_, key);
    std::fputs(": ", pOut_);
    bAfterKey_ = true;
    return *this;
}

JsonWriter &JsonWriter::BeginObject()
{
    BeforeValue();
    std::fputc('{', pOut_);
    stack_.push_back({false, true});
    return *this;
}

JsonWriter &JsonWriter::BeginArray()
{
    BeforeValue();
    std::fputc('[', pOut_);
    stack_.push_back({true, true});
    return *this;
}

JsonWriter &JsonWriter::Close(char cClose)
{
    const bool bEmpty = stack_.back().bEmpty;
    stack_.pop_back();
    if (!bEmpty)
        NewLine();
    std::fputc(cClose, pOut_);
    return *this;
}

JsonWriter &JsonWriter::EndObject()
{
    return Close('}');
}

JsonWriter &JsonWriter::EndArray()
{
    return Close(']');
}

JsonWriter &JsonWriter::String(std::string_view value)
{
    BeforeValue();
    WriteEscaped(pOut_, value);
    return *this;
}

JsonWriter &JsonWriter::Int(int64_t value)
{
    BeforeValue();
    std::fprintf(pOut_, "%" PRId64, value);
    return *this;
}

JsonWriter &JsonWriter::Uint(uint64_t value)
{
    BeforeValue();
    std::fprintf(pOut_, "%" PRIu64, value);
    return *this;
}

JsonWriter &JsonWriter::Bool(bool value)
{
    BeforeValue();
    std::fputs(value ? "true" : "false", pOut_);
    return *this;
}

JsonWriter &JsonWriter::Null()
{
    BeforeValue();
    std::fputs("null", pOut_);
    return *this;
}

void Value::Write(JsonWriter &writer) const
{
    switch (kind_) {
    case Kind::Null: writer.Null(); break;
    case Kind::String: writer.String(text_); break;
    case Kind::Int: writer.Int(int_); break;
    case Kind::Bool: writer.Bool(int_ != 0); break;
    case Kind::Object:
        writer.BeginObject();
        for (const auto &[key, value] : members_) {
            writer.Key(key);
            value.Write(writer);
        }
        writer.EndObject();
        break;
    case Kind::Array:
        writer.BeginArray();
        for (const auto &member : members_)
            member.second.Write(writer);
        writer.EndArray();
        break;
    }
}

std::string Value::Text() const
{
    switch (kind_) {
    case Kind::String: return text_;
    case Kind::Int: return std::to_string(int_);
    case Kind::Bool: return int_ ? "true" : "false";
    case Kind::Array: {
        std::string text;
        for (const auto &member : members_)
            text += (text.empty() ? "" : ",") + member.second.Text();
        return text;
    }
    default: return std::string();
    }
}

void Value::WriteFlat(std::FILE *pOut, const std::string &prefix) const
{
    if (kind_ == Kind::Object) {
        for (const auto &[key, value] : members_)
            value.WriteFlat(pOut, prefix.empty() ? key : prefix + "." + key);
        return;
    }
    std::fprintf(pOut, "%s=%s\n", prefix.c_str(), Text().c_str());
}

} // namespace vorcal::cli
