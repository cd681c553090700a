// FlatJson held to another JSON library: what it takes and refuses, and which fields it finds.

#include "host/formats/FlatJson.h"
#include "base/EntryFields.h"

#include <gtest/gtest.h>
#include <nlohmann/json.hpp>

#include <algorithm>
#include <random>
#include <string>
#include <utility>
#include <vector>

using namespace zrm;
using namespace zrm::host;

namespace {

using Json = nlohmann::ordered_json;
using Flat = std::vector<std::pair<std::string, std::string>>;

class Generator {
public:
    explicit Generator(unsigned seed) : m_random(seed) {}

    Json object(int depth) {
        Json made = Json::object();
        for (int i = pick(7); i > 0; --i) {
            made[text()] = value(depth);
        }
        return made;
    }
    int pick(int below) { return std::uniform_int_distribution(0, below - 1)(m_random); }
    /// Changes, removes or adds a byte.
    void damage(std::string& text) {
        const auto at = static_cast<std::size_t>(pick(static_cast<int>(text.size())));
        // Without exponents, which the model refuses when it cannot hold the number.
        constexpr std::string_view bytes = "{}[]\",:\\ 0-.tn\n\x01\xc3\xff";
        const char byte = bytes[static_cast<std::size_t>(pick(static_cast<int>(bytes.size())))];
        switch (pick(3)) {
        case 0:
            text[at] = byte;
            break;
        case 1:
            text.erase(at, 1);
            break;
        default:
            text.insert(at, 1, byte);
        }
    }

private:
    Json value(int depth) {
        switch (pick(depth > 0 ? 9 : 7)) {
        case 0:
            return pick(2000000) - 1000000;
        case 1:
            return nullptr;
        case 2:
            return pick(2) == 0;
        case 7:
            return object(depth - 1);
        case 8: {
            Json made = Json::array();
            for (int i = pick(4); i > 0; --i) {
                made.push_back(value(depth - 1));
            }
            return made;
        }
        default:
            return text();
        }
    }
    std::string text() {
        constexpr const char* parts[] = {"a",  "b",  "level", "\"", "\\", "\n", "\xc3\xa4",
                                         "{}", "[,", ":",     " ",  "\t", "/",  "\xf0\x9f\x98\x80"};
        std::string made;
        for (int i = pick(6); i > 0; --i) {
            made += parts[pick(static_cast<int>(std::size(parts)))];
        }
        return made;
    }

    std::mt19937 m_random;
};

void flatten(const Json& value, const std::string& name, Flat& out) {
    if (value.is_structured()) {
        for (const auto& [key, inner] : value.items()) {
            flatten(inner, name + "." + key, out);
        }
    } else if (!value.is_null() && name.size() > 1) {
        const std::string text = value.is_string() ? value.get<std::string>() : value.dump();
        const bool isKnown = std::any_of(out.begin(), out.end(), [&](const auto& field) {
            return field.first == name.substr(1);
        });
        if (!isKnown) {
            out.emplace_back(name.substr(1), text);
        }
    }
}

Flat fieldsOf(const FlatJson& json) {
    EntryFields fields;
    json.addTo(fields);
    Flat flat;
    for (const auto& [name, value] : fields.all()) {
        flat.emplace_back(name, value);
    }
    return flat;
}

constexpr unsigned seed = 20261122;

} // namespace

TEST(FlatJson, FindsTheFieldsThatAreThere) {
    Generator generator(seed);
    const JsonNames names({});
    FlatJson json(names);
    for (int i = 0; i < 5000; ++i) {
        const Json object = generator.object(4);
        const int indent = generator.pick(4) - 1;
        const std::string text = object.dump(indent, ' ', generator.pick(2) == 0);
        ASSERT_TRUE(json.read(text)) << text << "\n" << json.reason();
        Flat wanted;
        flatten(object, "", wanted);
        ASSERT_EQ(fieldsOf(json), wanted) << text;
    }
}

TEST(FlatJson, RefusesWhatIsDamaged) {
    Generator generator(seed + 1);
    const JsonNames names({});
    FlatJson json(names);
    int refused = 0;
    for (int i = 0; i < 15000; ++i) {
        std::string text = generator.object(4).dump();
        for (int damages = 1 + generator.pick(2); damages > 0; --damages) {
            generator.damage(text);
        }
        const Json model = Json::parse(text, nullptr, false);
        ASSERT_EQ(json.read(text), model.is_object()) << text << "\n" << json.reason();
        refused += model.is_object() ? 0 : 1;
    }
    EXPECT_GT(refused, 5000);
    EXPECT_LT(refused, 14900);
}
