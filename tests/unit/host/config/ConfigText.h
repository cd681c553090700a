#ifndef ZRM_TESTS_CONFIG_TEXT_H
#define ZRM_TESTS_CONFIG_TEXT_H

#include "host/config/ConfigFile.h"

#include <gtest/gtest.h>

#include <string>
#include <utility>
#include <vector>

using namespace zrm::host;

/// The configuration of a text that must be valid.
inline HostConfig accepted(const std::string& text) {
    ConfigFile::Result result = ConfigFile::parse(text, "zrm.toml");
    if (!result) {
        ADD_FAILURE() << result.error().front();
        return {};
    }
    return std::move(*result);
}

/// The problems of a text; none when it is valid.
inline std::vector<std::string> problemsOf(const std::string& text) {
    const ConfigFile::Result result = ConfigFile::parse(text, "zrm.toml");
    return result ? std::vector<std::string>{} : result.error();
}

#endif
