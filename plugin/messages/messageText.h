// SPDX-License-Identifier: Apache-2.0
// From a key of the catalogue to the text that is shown.
#pragma once

#include "messages/catalogue.h"
#include "openquarn/HString.h"

#include <concepts>
#include <filesystem>
#include <string>

namespace neuralWarp {

/// The host's text for an id; "unknown error" when the host answers with a failure. [any]
HString messageText(const HStringResourceId& id);
HString messageText(Text text);

/// Arguments of a text. Numbers are in plain decimal, without grouping, whatever the locale. [any]
inline const HString& argumentText(const HString& text) {
    return text;
}
template <std::same_as<std::filesystem::path> Path>
HString argumentText(const Path& path) {
    return HString(path.string());
}
template <std::integral Number>
HString argumentText(Number number) requires(!std::same_as<Number, bool>) {
    return HString(std::to_string(number));
}

/// The text with its placeholders filled, in their order. It takes as many arguments as the catalogue's text has, each
/// a text, a path or an integer. [any]
template <Text key, class... Arguments>
HString filledText(const Arguments&... arguments) {
    static_assert(sizeof...(Arguments) == argumentCount(entryOf(key).text), "wrong number of arguments of this text");
    return HString::format(messageText(key), argumentText(arguments)...);
}

/// Raises a message: `raiseMessage<Text::kErrorMLModelInit>(displayErrorGated, index)`. Returns what the display does.
/// `display` is called with the filled text. [any]
template <Text key, class Display, class... Arguments>
decltype(auto) raiseMessage(Display&& display, const Arguments&... arguments) {
    return display(filledText<key>(arguments...));
}

} // namespace neuralWarp
