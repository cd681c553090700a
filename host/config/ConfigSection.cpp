#include "host/config/ConfigSection.h"

#include <algorithm>

namespace zrm::host {

namespace {

unsigned lineOf(const toml::source_region& source) {
    return static_cast<unsigned>(source.begin.line);
}

/// A value's type as an operator would call it.
const char* typeName(const toml::node& node) {
    switch (node.type()) {
    case toml::node_type::table:
        return "a table";
    case toml::node_type::array:
        return "a list";
    case toml::node_type::string:
        return "a text";
    case toml::node_type::integer:
        return "a whole number";
    case toml::node_type::floating_point:
        return "a number with a fraction";
    case toml::node_type::boolean:
        return "a boolean";
    default:
        return "a date or time";
    }
}

} // namespace

ConfigSection::ConfigSection(std::string name, const toml::table& table, ConfigProblems& problems)
    : m_name(std::move(name)), m_table(table), m_problems(problems) {}

const toml::node* ConfigSection::find(std::string_view key) {
    if (std::find(m_known.begin(), m_known.end(), key) == m_known.end()) {
        m_known.emplace_back(key);
    }
    return m_table.get(key);
}

unsigned ConfigSection::line(std::string_view key) const {
    const toml::node* const node = m_table.get(key);
    return lineOf(node == nullptr ? m_table.source() : node->source());
}

void ConfigSection::problem(unsigned line, std::string_view key, const std::string& what,
                            const std::string& cure) {
    m_problems.add(line, {what, cure, (m_name.empty() ? "" : m_name + '.') + std::string(key)});
}

void ConfigSection::problem(std::string_view key, const std::string& what,
                            const std::string& cure) {
    problem(line(key), key, what, cure);
}

void ConfigSection::wrongType(std::string_view key, const toml::node& node, const char* cure) {
    problem(lineOf(node.source()), key, std::string("is ") + typeName(node), cure);
}

std::optional<std::string> ConfigSection::text(std::string_view key) {
    const toml::node* const node = find(key);
    if (node == nullptr) {
        return std::nullopt;
    }
    if (!node->is_string()) {
        wrongType(key, *node, "write a text in quotes");
        return std::nullopt;
    }
    const std::string& text = node->as_string()->get();
    if (text.find('\0') != std::string::npos) {
        problem(key, "contains a NUL character", "leave it out");
        return std::nullopt;
    }
    return text;
}

/// Adds a text of a list, or records what is wrong with it and returns false.
bool ConfigSection::addText(std::vector<Text>& texts, std::string_view key,
                            const toml::node& item) {
    const auto* const text = item.as_string();
    if (text == nullptr) {
        wrongType(key, item, "write a list of texts in quotes");
        return false;
    }
    const unsigned line = lineOf(text->source());
    if (text->get().find('\0') != std::string::npos) {
        problem(line, key, "contains a NUL character", "leave it out");
        return false;
    }
    texts.emplace_back(text->get(), line);
    return true;
}

std::optional<std::int64_t> ConfigSection::number(std::string_view key) {
    const toml::node* const node = find(key);
    if (node == nullptr) {
        return std::nullopt;
    }
    if (!node->is_integer()) {
        wrongType(key, *node, "write a whole number");
        return std::nullopt;
    }
    return node->as_integer()->get();
}

std::optional<bool> ConfigSection::truth(std::string_view key) {
    const toml::node* const node = find(key);
    if (node == nullptr) {
        return std::nullopt;
    }
    if (!node->is_boolean()) {
        wrongType(key, *node, "write true or false");
        return std::nullopt;
    }
    return node->as_boolean()->get();
}

std::optional<std::vector<ConfigSection::Text>> ConfigSection::texts(std::string_view key) {
    const toml::node* const node = find(key);
    if (node == nullptr) {
        return std::nullopt;
    }
    std::vector<Text> texts;
    const toml::array* const list = node->as_array();
    bool isRight = list != nullptr || addText(texts, key, *node);
    if (list != nullptr) {
        for (const toml::node& item : *list) {
            isRight = addText(texts, key, item) && isRight;
        }
    }
    return isRight ? std::optional(std::move(texts)) : std::nullopt;
}

const toml::table* ConfigSection::table(std::string_view key) {
    const toml::node* const node = find(key);
    if (node != nullptr && !node->is_table()) {
        const std::string path = (m_name.empty() ? "" : m_name + '.') + std::string(key);
        wrongType(key, *node, ("write it as [" + path + "]").c_str());
        return nullptr;
    }
    return node == nullptr ? nullptr : node->as_table();
}

std::optional<ConfigSection> ConfigSection::section(std::string_view key) {
    const toml::table* const found = table(key);
    return found == nullptr ? std::nullopt : std::optional(inner(key, *found));
}

ConfigSection ConfigSection::inner(std::string_view key, const toml::table& table) const {
    return {(m_name.empty() ? "" : m_name + '.') + std::string(key), table, m_problems};
}

void ConfigSection::refuse(std::string_view key, const std::string& what, const std::string& cure) {
    if (find(key) != nullptr) {
        problem(key, what, cure);
    }
}

std::vector<std::string> ConfigSection::keys() const {
    std::vector<std::string> keys;
    for (const auto& [key, node] : m_table) {
        keys.emplace_back(key.str());
    }
    return keys;
}

std::optional<std::vector<const toml::table*>> ConfigSection::tables(std::string_view key) {
    const toml::node* const node = find(key);
    if (node == nullptr) {
        return std::nullopt;
    }
    const std::string cure = "write it as [[" + std::string(key) + "]]";
    std::vector<const toml::table*> tables;
    const toml::array* const list = node->as_array();
    if (list == nullptr) {
        wrongType(key, *node, cure.c_str());
        return tables;
    }
    for (const toml::node& item : *list) {
        if (item.is_table()) {
            tables.push_back(item.as_table());
        } else {
            wrongType(key, item, cure.c_str());
        }
    }
    return tables;
}

void ConfigSection::refuseUnknownKeys() {
    std::string keys;
    for (const std::string& known : m_known) {
        keys += (keys.empty() ? "" : ", ") + known;
    }
    for (const auto& [key, node] : m_table) {
        if (std::find(m_known.begin(), m_known.end(), key.str()) == m_known.end()) {
            problem(lineOf(key.source()), key.str(), "unknown key", "the keys here are " + keys);
        }
    }
}

} // namespace zrm::host
