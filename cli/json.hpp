// A small streaming JSON writer: objects, arrays, strings, integers, booleans and null, written
// straight to a FILE with two-space indentation. Strings are escaped as RFC 8259 requires and
// bytes that are not valid UTF-8 (file names may hold any byte) become U+FFFD.
#pragma once

#include <cstdint>
#include <cstdio>
#include <string>
#include <string_view>
#include <utility>
#include <vector>

namespace vorcal::cli {

class JsonWriter {
public:
    explicit JsonWriter(std::FILE *pOut) : pOut_(pOut) {}
    ~JsonWriter();

    JsonWriter &BeginObject();
    JsonWriter &EndObject();
    JsonWriter &BeginArray();
    JsonWriter &EndArray();
    // Inside an object every value is preceded by its key.
    JsonWriter &Key(std::string_view key);
    JsonWriter &String(std::string_view value);
    JsonWriter &Int(int64_t value);
    JsonWriter &Uint(uint64_t value);
    JsonWriter &Bool(bool value);
    JsonWriter &Null();

    // Shorthands for a key and its value.
    JsonWriter &Field(std::string_view key, std::string_view value) { return Key(key).String(value); }
    JsonWriter &Field(std::string_view key, const char *value) { return Key(key).String(value); }
    JsonWriter &Field(std::string_view key, uint64_t value) { return Key(key).Uint(value); }
    JsonWriter &Field(std::string_view key, uint32_t value) { return Key(key).Uint(value); }
    JsonWriter &Field(std::string_view key, int64_t value) { return Key(key).Int(value); }
    JsonWriter &Field(std::string_view key, int32_t value) { return Key(key).Int(value); }
    JsonWriter &Field(std::string_view key, bool value) { return Key(key).Bool(value); }

    // Writes value as a JSON string literal (quotes included).
    static void WriteEscaped(std::FILE *pOut, std::string_view value);

private:
    void BeforeValue();
    void NewLine();
    JsonWriter &Close(char cClose);

    struct Level {
        bool bArray;
        bool bEmpty;
    };
    std::FILE *pOut_;
    std::vector<Level> stack_;
    bool bAfterKey_ = false;
};

// A record the verbs build once and print either as JSON or as ffprobe-style "key=value" lines.
class Value {
public:
    enum class Kind : uint8_t { Null, String, Int, Bool, Object, Array };
    Value() = default;
    Value(const char *p) : kind_(Kind::String), text_(p) {}
    Value(std::string text) : kind_(Kind::String), text_(std::move(text)) {}
    Value(int64_t i) : kind_(Kind::Int), int_(i) {}
    Value(int32_t i) : kind_(Kind::Int), int_(i) {}
    Value(uint32_t u) : kind_(Kind::Int), int_(u) {}
    Value(uint64_t u) : kind_(Kind::Int), int_(static_cast<int64_t>(u)) {}
    Value(bool b) : kind_(Kind::Bool), int_(b) {}
    static Value Object() { return Value(Kind::Object); }
    static Value Array() { return Value(Kind::Array); }

    // Object: appends a member (keys stay in the order added).
    Value &Add(std::string key, Value value)
    {
        members_.emplace_back(std::move(key), std::move(value));
        return *this;
    }
    // Array: appends an item.
    Value &Push(Value value)
    {
        members_.emplace_back(std::string(), std::move(value));
        return *this;
    }
    Kind GetKind() const { return kind_; }
    const std::vector<std::pair<std::string, Value>> &Members() const { return members_; }

    void Write(JsonWriter &writer) const;
    // One "prefix.key=value" line per scalar; arrays print their items joined by commas.
    void WriteFlat(std::FILE *pOut, const std::string &prefix) const;
    // The scalar as text ("" for null and containers).
    std::string Text() const;

private:
    explicit Value(Kind kind) : kind_(kind) {}
    Kind kind_ = Kind::Null;
    std::string text_;
    int64_t int_ = 0;
    std::vector<std::pair<std::string, Value>> members_;
};

} // namespace vorcal::cli
