#include "simhub/RegistryJson.h"

#include <bit>
#include <charconv>
#include <cmath>
#include <cstdint>
#include <limits>
#include <set>

#include <nlohmann/json.hpp>

namespace simhub {
namespace {

using Json = nlohmann::json;
using Item = sns_registry_data_item;

constexpr std::uint32_t kQuietNan = 0x7fc00000;
constexpr int kMaxNesting = 8;  // the form needs three
constexpr std::size_t kBitsDigits = 8;

bool isUtf8(const std::string& text) {
  // The encoder refuses exactly what is not UTF-8.
  try {
    (void)Json(text).dump();
    return true;
  } catch (const Json::exception&) {
    return false;
  }
}

std::string toHex(const std::string& bytes) {
  static constexpr char kDigits[] = "0123456789abcdef";
  std::string hex;
  for (const char c : bytes) {
    hex += kDigits[static_cast<unsigned char>(c) >> 4];
    hex += kDigits[static_cast<unsigned char>(c) & 0xf];
  }
  return hex;
}

bool fromHex(const std::string& hex, std::string* bytes) {
  if (hex.size() % 2 != 0) return false;
  bytes->clear();
  for (std::size_t i = 0; i < hex.size(); i += 2) {
    unsigned value = 0;
    const auto [end, status] = std::from_chars(&hex[i], &hex[i] + 2, value, 16);
    if (status != std::errc{} || end != &hex[i] + 2) return false;
    *bytes += static_cast<char>(value);
  }
  return true;
}

std::string textMember(const char* key, const std::string& text) {
  if (isUtf8(text)) return "\"" + std::string(key) + "\": " + Json(text).dump();
  return "\"" + std::string(key) + "_hex\": \"" + toHex(text) + "\"";
}

std::string formatFloat(float value) {
  const auto bits = std::bit_cast<std::uint32_t>(value);
  if (std::isinf(value)) return value > 0 ? "\"inf\"" : "\"-inf\"";
  char text[48];
  if (std::isnan(value)) {
    if (bits == kQuietNan) return "\"nan\"";
    (void)std::snprintf(text, sizeof text, "\"nan:%08x\"", bits);
    return text;
  }
  // The file's numbers are read as doubles. Where the shortest decimal of the float would be rounded twice on
  // the way back to another float, the double's own is used.
  char* end = std::to_chars(text, text + sizeof text, value).ptr;
  double asRead = 0;
  (void)std::from_chars(text, end, asRead);
  if (std::bit_cast<std::uint32_t>(static_cast<float>(asRead)) != bits) {
    end = std::to_chars(text, text + sizeof text, static_cast<double>(value)).ptr;
  }
  std::string decimal(text, end);
  // Without a point it would be read as an integer, which has no negative zero.
  if (decimal.find_first_of(".e") == std::string::npos) decimal += ".0";
  return decimal;
}

bool parseFloat(const Json& json, float* value) {
  if (json.is_number()) {
    const double number = json.get<double>();
    // Past this, rounding to float gives infinity.
    constexpr double kLimit = 0x1.ffffffp127;
    if (!(std::fabs(number) < kLimit)) return false;
    *value = static_cast<float>(number);
    return true;
  }
  if (!json.is_string()) return false;
  const auto& text = json.get_ref<const std::string&>();
  if (text == "inf" || text == "-inf") {
    *value = (text == "inf" ? 1.0F : -1.0F) * std::numeric_limits<float>::infinity();
    return true;
  }
  std::uint32_t bits = kQuietNan;
  if (text != "nan") {
    const std::string prefix = "nan:";
    if (text.rfind(prefix, 0) != 0 || text.size() != prefix.size() + kBitsDigits) return false;
    const char* const end = text.data() + text.size();
    const auto [last, status] = std::from_chars(text.data() + prefix.size(), end, bits, 16);
    if (status != std::errc{} || last != end) return false;
  }
  *value = std::bit_cast<float>(bits);
  return std::isnan(*value);
}

/// False: no integer, or one past 64 bits with a sign, which would come out as another.
bool parseInteger(const Json& json, std::int64_t* value) {
  if (!json.is_number_integer()) return false;
  constexpr auto kLimit = std::uint64_t{std::numeric_limits<std::int64_t>::max()};
  if (json.is_number_unsigned() && json.get<std::uint64_t>() > kLimit) return false;
  *value = json.get<std::int64_t>();
  return true;
}

/// One member of an item's object. False: unknown, or of the wrong type.
bool parseMember(const std::string& key, const Json& value, Item* item) {
  if (key == "name" && value.is_string()) {
    item->set_name(value.get_ref<const std::string&>());
    return true;
  }
  if (key == "name_hex" && value.is_string()) {
    return fromHex(value.get_ref<const std::string&>(), item->mutable_name());
  }
  if (key == "version") {
    std::int64_t version = 0;
    if (!parseInteger(value, &version) || version != static_cast<std::int32_t>(version)) return false;
    item->set_version(static_cast<std::int32_t>(version));
    return true;
  }
  if (item->data_case() != Item::DATA_NOT_SET) return false;  // one kind of data only
  if (key == "group" && value.is_boolean() && value.get<bool>()) {
    item->mutable_subgrp();
    return true;
  }
  if (key == "float") {
    float number = 0;
    if (!parseFloat(value, &number)) return false;
    item->set_flt(number);
    return true;
  }
  if (key == "int") {
    std::int64_t number = 0;
    if (!parseInteger(value, &number)) return false;
    item->set_sint(number);
    return true;
  }
  if (key == "string" && value.is_string()) {
    item->set_str(value.get_ref<const std::string&>());
    return true;
  }
  return key == "string_hex" && value.is_string() &&
         fromHex(value.get_ref<const std::string&>(), item->mutable_str());
}

bool parseItem(const Json& json, Item* item, std::string* error) {
  if (!json.is_object()) {
    *error = "an item is not an object";
    return false;
  }
  for (const auto& [key, value] : json.items()) {
    if (!parseMember(key, value, item)) {
      *error = "an item's \"" + key + "\" is unknown or has the wrong type";
      return false;
    }
  }
  if (!item->has_name()) *error = "an item has no name";
  return item->has_name();
}

/// Whether brackets outside of strings nest no deeper than the form needs, so that no parser is asked to
/// follow.
bool nestsLittle(const std::string& text) {
  int depth = 0;
  bool inString = false;
  for (std::size_t i = 0; i < text.size(); ++i) {
    const char c = text[i];
    if (inString) {
      if (c == '\\') ++i;
      inString = c != '"';
    } else if (c == '"') {
      inString = true;
    } else if (c == '{' || c == '[') {
      if (++depth > kMaxNesting) return false;
    } else if (c == '}' || c == ']') {
      --depth;
    }
  }
  return true;
}

bool parseJson(const std::string& text, Json* json, std::string* error) {
  try {
    *json = Json::parse(text);
    return true;
  } catch (const Json::exception& exception) {
    *error = exception.what();
    return false;
  }
}

}  // namespace

std::string formatRegistryGroup(const sns_registry_data& items) {
  std::string text = "{\n  \"items\": [";
  const char* separator = "\n";
  for (const Item& item : items.items()) {
    text += separator;
    separator = ",\n";
    text += "    {" + textMember("name", item.name());
    if (item.has_version()) text += ", \"version\": " + std::to_string(item.version());
    switch (item.data_case()) {
      case Item::kSubgrp:
        text += ", \"group\": true";
        break;
      case Item::kStr:
        text += ", " + textMember("string", item.str());
        break;
      case Item::kFlt:
        text += ", \"float\": " + formatFloat(item.flt());
        break;
      case Item::kSint:
        text += ", \"int\": " + std::to_string(item.sint());
        break;
      case Item::DATA_NOT_SET:
        break;
    }
    text += "}";
  }
  return text + "\n  ]\n}\n";
}

bool parseRegistryGroup(const std::string& text, sns_registry_data* items, std::string* error) {
  items->Clear();
  if (text.size() > kMaxRegistryFileBytes) {
    *error = "larger than " + std::to_string(kMaxRegistryFileBytes) + " bytes";
    return false;
  }
  if (!nestsLittle(text)) {
    *error = "nested too deeply";
    return false;
  }
  Json json;
  if (!parseJson(text, &json, error)) return false;
  if (!json.is_object() || json.size() != 1 || !json.contains("items") || !json["items"].is_array()) {
    *error = "not an object with the one member \"items\", a list";
    return false;
  }
  std::set<std::string> names;
  for (const Json& entry : json["items"]) {
    Item* const item = items->add_items();
    if (!parseItem(entry, item, error)) return false;
    if (!names.insert(item->name()).second) {
      *error = "item \"" + item->name() + "\" stands twice";
      return false;
    }
  }
  return true;
}

}  // namespace simhub
