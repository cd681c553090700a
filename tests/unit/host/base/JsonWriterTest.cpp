#include "host/base/JsonWriter.h"

#include "host/base/SteeringText.h"
#include "host/base/Utf8.h"

#include <gtest/gtest.h>

#include <cstdint>
#include <cstring>
#include <functional>
#include <limits>
#include <optional>
#include <random>
#include <stdexcept>
#include <string>
#include <vector>

#include <nlohmann/json.hpp>

using namespace zrm::host;

namespace {

using Document = nlohmann::ordered_json;

std::string jsonText(std::string_view text) {
    return JsonWriter::text([&](JsonWriter& json) { json.value(text); });
}

std::string jsonNumber(double number) {
    return JsonWriter::text([&](JsonWriter& json) { json.value(number); });
}

std::string dump(const Document& document) {
    return document.dump(-1, ' ', false, Document::error_handler_t::replace);
}

void write(JsonWriter& json, const Document& document) {
    switch (document.type()) {
    case Document::value_t::object:
        json.beginObject();
        for (const auto& [key, value] : document.items()) {
            write(json.key(key), value);
        }
        json.endObject();
        break;
    case Document::value_t::array:
        json.beginArray();
        for (const Document& value : document) {
            write(json, value);
        }
        json.endArray();
        break;
    case Document::value_t::string:
        json.value(document.get<std::string>());
        break;
    case Document::value_t::boolean:
        json.value(document.get<bool>());
        break;
    case Document::value_t::number_integer:
        json.value(document.get<std::int64_t>());
        break;
    case Document::value_t::number_unsigned:
        json.value(document.get<std::uint64_t>());
        break;
    case Document::value_t::number_float:
        json.value(document.get<double>());
        break;
    default:
        json.null();
    }
}

/// Random documents full of what is hard to write.
class Documents {
public:
    explicit Documents(unsigned seed) : m_random(seed) {}

    Document next(int depth = 0) {
        const unsigned kind = below(depth > 6 ? 6 : 9);
        if (kind < 6) {
            return scalar(kind);
        }
        Document document = kind == 6 ? Document::array() : Document::object();
        for (unsigned count = below(6); count > 0; --count) {
            if (kind == 6) {
                document.push_back(next(depth + 1));
            } else {
                document[text()] = next(depth + 1);
            }
        }
        return document;
    }

private:
    unsigned below(unsigned limit) { return static_cast<unsigned>(m_random()) % limit; }

    Document scalar(unsigned kind) {
        switch (kind) {
        case 0:
            return nullptr;
        case 1:
            return below(2) == 0;
        case 2:
            return static_cast<std::int64_t>(m_random() >> below(64));
        case 3:
            return m_random();
        case 4:
            return -static_cast<double>(below(1u << 20)) / (1u << below(8));
        default:
            return text();
        }
    }

    std::string text() {
        static const std::vector<std::string> pieces = {"a",
                                                        "plain text",
                                                        "\"",
                                                        "\\",
                                                        "/",
                                                        std::string(1, '\0'),
                                                        "\x1b[",
                                                        "\n",
                                                        "\x7f",
                                                        "\xc3\xbc",
                                                        "\xe2\x82",
                                                        "\xff",
                                                        "\xed\xa0\x80",
                                                        "\xc0\xaf",
                                                        "\xe2\x80\xae",
                                                        "\xf0\x9f\x98\x80",
                                                        "\xf0\x9f\x98",
                                                        std::string(300, 'x')};
        std::string text;
        for (unsigned count = below(10) == 0 ? below(40) : below(5); count > 0; --count) {
            text += pieces[below(static_cast<unsigned>(pieces.size()))];
        }
        return text;
    }

    std::mt19937_64 m_random;
};

TEST(JsonWriter, WritesEveryKindOfValue) {
    const std::string text = JsonWriter::text([](JsonWriter& json) {
        json.beginObject().member("text", "a").member("yes", true).member("no", false);
        json.member("number", -5).member("large", std::numeric_limits<std::uint64_t>::max());
        json.member("small", std::numeric_limits<std::int64_t>::min()).key("nothing").null();
        json.member("none", std::optional<int>()).member("some", std::optional(7));
        json.member("list", std::vector<std::string>{"a", "b"});
        json.member("empty", std::vector<int>());
        json.textOrNull("left out", "").textOrNull("given", "x");
        json.key("raised").time(1'795'158'189'412).key("raw").raw("{\"a\":[1]}");
        json.key("object").beginObject().endObject().key("array").beginArray().beginArray();
        json.endArray().value(1u).beginObject().endObject().endArray().endObject();
    });
    EXPECT_EQ(text, R"({"text":"a","yes":true,"no":false,"number":-5,"large":18446744073709551615,)"
                    R"("small":-9223372036854775808,"nothing":null,"none":null,"some":7,)"
                    R"("list":["a","b"],"empty":[],"left out":null,"given":"x",)"
                    R"("raised":"2026-11-20T07:03:09.412Z","raw":{"a":[1]},"object":{},)"
                    R"("array":[[],1,{}]})");
}

TEST(JsonWriter, AppendsToTheText) {
    std::string text = "data: ";
    JsonWriter::append(text, [](JsonWriter& json) { json.value("a"); });
    JsonWriter::append(text, [](JsonWriter& json) { json.value(5); });
    EXPECT_EQ(text, "data: \"a\"5");
}

TEST(JsonWriter, AKeyForManyUsesIsWrittenLikeAnyOther) {
    for (const char* const name :
         {"", "a", "ENTRYTIME", "a key of more than sixteen bytes", "\"\x1b"}) {
        const JsonKey key{name};
        const auto twice = [](const auto& form) {
            return JsonWriter::text([&](JsonWriter& json) {
                json.beginObject().key(form).value(1).key(form).value(2).endObject();
            });
        };
        EXPECT_EQ(twice(key), twice(std::string_view(name)));
    }
    EXPECT_THROW(JsonKey(std::string(2000, 'x')), std::logic_error);
}

TEST(JsonWriter, WritesNumbersAsTheJsonLibraryDoes) {
    for (const double number : {0.0,
                                -0.0,
                                1.0,
                                -1.0,
                                0.1,
                                0.5,
                                2.5,
                                100.0,
                                1e5,
                                1e14,
                                999'999'999'999'999.0,
                                1e15,
                                1.5e15,
                                1e16,
                                1e22,
                                1e300,
                                1e-3,
                                1e-4,
                                1.25e-4,
                                9e-5,
                                1e-5,
                                1e-300,
                                5e-324,
                                std::numeric_limits<double>::max(),
                                std::numeric_limits<double>::infinity(),
                                -std::numeric_limits<double>::infinity(),
                                std::numeric_limits<double>::quiet_NaN()}) {
        EXPECT_EQ(jsonNumber(number), nlohmann::json(number).dump());
    }
    std::mt19937_64 random(20261122);
    for (int round = 0; round < 100'000; ++round) {
        const std::uint64_t bits = random();
        double number;
        std::memcpy(&number, &bits, sizeof number);
        if (number - number == 0) { // finite
            ASSERT_EQ(nlohmann::json::parse(jsonNumber(number)).get<double>(), number);
        }
    }
}

TEST(JsonWriter, AgreesWithTheJsonLibraryOnRandomDocuments) {
    Documents documents(20261122);
    for (int round = 0; round < 5000; ++round) {
        const Document document = documents.next();
        const std::string text = JsonWriter::text([&](JsonWriter& json) { write(json, document); });
        const std::string expected = dump(document);
        ASSERT_EQ(SteeringText::escapedInJson(text), SteeringText::escapedInJson(expected));
        ASSERT_EQ(Document::parse(text), Document::parse(expected));
    }
}

TEST(JsonWriter, RefusesWhatIsNotJson) {
    using Write = std::function<void(JsonWriter&)>;
    const Write misuses[] = {
        [](JsonWriter&) {},
        [](JsonWriter& json) { json.value(1).value(2); },
        [](JsonWriter& json) { json.beginArray().endArray().beginArray().endArray(); },
        [](JsonWriter& json) { json.value(1).null(); },
        [](JsonWriter& json) { json.beginObject(); },
        [](JsonWriter& json) { json.beginArray().value(1); },
        [](JsonWriter& json) { json.beginArray().beginObject().endObject(); },
        [](JsonWriter& json) { json.endObject(); },
        [](JsonWriter& json) { json.endArray(); },
        [](JsonWriter& json) { json.beginObject().endArray(); },
        [](JsonWriter& json) { json.beginArray().endObject(); },
        [](JsonWriter& json) { json.beginObject().endObject().endObject(); },
        [](JsonWriter& json) { json.beginObject().value("a"); },
        [](JsonWriter& json) { json.beginObject().member("a", 1).value(2); },
        [](JsonWriter& json) { json.beginObject().beginArray(); },
        [](JsonWriter& json) { json.beginObject().key("a").key("b"); },
        [](JsonWriter& json) { json.beginObject().key("a").endObject(); },
        [](JsonWriter& json) { json.key("a"); },
        [](JsonWriter& json) { json.key(JsonKey("a")); },
        [](JsonWriter& json) { json.beginArray().key("a"); },
        [](JsonWriter& json) { json.beginObject().member("a", 1).endObject().key("b"); },
    };
    for (const Write& misuse : misuses) {
        EXPECT_THROW(JsonWriter::text(misuse), std::logic_error) << &misuse - misuses;
    }
}

TEST(JsonWriter, NestingIsBounded) {
    const auto nested = [](unsigned depth, bool isObject) {
        return JsonWriter::text([&](JsonWriter& json) {
            for (unsigned level = 0; level < depth; ++level) {
                isObject&& level > 0 ? json.key("a").beginObject()
                : isObject           ? json.beginObject()
                                     : json.beginArray();
            }
            for (unsigned level = 0; level < depth; ++level) {
                isObject ? json.endObject() : json.endArray();
            }
        });
    };
    constexpr unsigned most = JsonWriter::mostNested;
    EXPECT_EQ(nested(most, false), std::string(most, '[') + std::string(most, ']'));
    EXPECT_TRUE(Document::accept(nested(most, true)));
    EXPECT_THROW(nested(most + 1, false), std::logic_error);
    EXPECT_THROW(nested(most + 1, true), std::logic_error);
}

TEST(JsonWriter, EscapesCharactersThatJsonDoesNotAllow) {
    EXPECT_EQ(jsonText(""), R"("")");
    EXPECT_EQ(jsonText("plain / text ~\x7f"), "\"plain / text ~\x7f\"");
    EXPECT_EQ(jsonText("\"\\\b\f\n\r\t"), R"("\"\\\b\f\n\r\t")");
    EXPECT_EQ(jsonText(std::string_view("\0\x01\x1f", 3)), R"("\u0000\u0001\u001f")");
    EXPECT_EQ(jsonText("Grüße € \U0001F600"), "\"Grüße € \U0001F600\"");
    EXPECT_EQ(jsonText("a\xFF\xE2\x82z"), "\"a\uFFFD\uFFFDz\"");
}

TEST(JsonWriter, WritesTextsOfAnySize) {
    for (std::size_t size = 900; size < 1100; ++size) {
        ASSERT_EQ(jsonText(std::string(size, 'x') + "\n"), '"' + std::string(size, 'x') + "\\n\"");
    }
    EXPECT_EQ(jsonText(std::string(5000, '"')), nlohmann::json(std::string(5000, '"')).dump());
}

// Each byte at each of the eight positions that are examined together.
TEST(JsonWriter, EscapesAtEveryPosition) {
    for (int byte = 0; byte < 128; ++byte) {
        for (std::size_t place = 0; place < 20; ++place) {
            std::string text(20, 'x');
            text[place] = static_cast<char>(byte);
            ASSERT_EQ(jsonText(text), nlohmann::json(text).dump()) << byte << " at " << place;
        }
    }
}

TEST(JsonWriter, AgreesWithTheJsonLibraryOnRandomBytes) {
    std::mt19937 random(20261120);
    for (int round = 0; round < 20000; ++round) {
        std::string text(random() % 40, ' ');
        for (char& c : text) {
            const unsigned kind = random() % 8;
            c = static_cast<char>(kind == 0   ? random() % 256
                                  : kind == 1 ? random() % 32
                                              : 'a' + kind);
        }
        const auto replace = nlohmann::json::error_handler_t::replace;
        const std::string written = jsonText(text);
        const auto parsed = nlohmann::json::parse(written);
        ASSERT_EQ(Utf8::validPrefix(written), written.size());
        if (Utf8::validPrefix(text) == text.size()) {
            ASSERT_EQ(parsed.get<std::string>(), text);
        }
        ASSERT_EQ(SteeringText::escapedInJson(written),
                  SteeringText::escapedInJson(nlohmann::json(text).dump(-1, ' ', false, replace)));
    }
}

TEST(JsonWriter, CharactersThatControlHowTextIsShownAreEscaped) {
    EXPECT_EQ(jsonText("\xc2\x9b"
                       "31m \xe2\x80\xae \xd8\x9c \xe2\x81\xa9 \xc2\xa0 \xe2\x82\xac"),
              "\"\\u009b31m \\u202e \\u061c \\u2069 \xc2\xa0 \xe2\x82\xac\"");
}

TEST(SteeringText, EscapingKeepsADocumentsMeaning) {
    EXPECT_EQ(SteeringText::escapedInJson(
                  "{\"a\": \"x\x7f\xc2\x85y\xe2\x80\xa8\xe2\x82\xac\xc3\xa4\"}\n"),
              "{\"a\": \"x\\u007f\\u0085y\\u2028\xe2\x82\xac\xc3\xa4\"}\n");
    EXPECT_EQ(SteeringText::escapedInJson("{}"), "{}");
    EXPECT_EQ(SteeringText::escapedInJson("\"\xe2\x80"), "\"\xe2\x80");
}

} // namespace
