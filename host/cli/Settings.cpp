#include "Settings.h"

#include <charconv>
#include <cstdlib>
#include <stdexcept>

namespace noctiva::cli {

namespace {

constexpr std::string_view kSignature = "vek ";
constexpr std::string_view kReversedSignature = " kev";

// strtol on a view (which has no terminating zero): leading blanks, an optional sign, digits; no
// digits gives 0. The long result is stored into 32 bits, as the module stores it.
std::int32_t parseLikeStrtol(std::string_view text) {
    std::size_t i = 0;
    while (i < text.size() && (text[i] == ' ' || text[i] == '\t' || text[i] == '\n' || text[i] == '\r' ||
                               text[i] == '\f' || text[i] == '\v'))
        ++i;
    const std::string rest(text.substr(i));
    return std::int32_t(std::strtol(rest.c_str(), nullptr, 10));
}

}  // namespace

ParameterValues defaultParameterValues() {
    ParameterValues values{};
    for (const cParameterInfo& p : shadowParameterTable()) values[std::size_t(p.number)] = p.defaultValue;
    return values;
}

bool readSettingsText(std::string_view text, ParameterValues& values) {
    if (!text.starts_with(kSignature) && !text.starts_with(kReversedSignature)) return false;
    text.remove_prefix(kSignature.size());
    std::size_t cursor = 0;
    for (std::size_t n = 0; n < values.size(); ++n) {
        const std::string name = "Parameter" + std::to_string(n);
        const std::size_t at = text.find(name, cursor);
        if (at == std::string_view::npos) continue;
        cursor = at + name.size();
        values[n] = parseLikeStrtol(text.substr(cursor));
    }
    return true;
}

std::string writeSettingsText(const ParameterValues& values) {
    std::string text(kSignature);
    for (std::size_t n = 0; n < values.size(); ++n)
        text += " Parameter" + std::to_string(n) + " " + std::to_string(values[n]) + " ";
    return text;
}

Assignment parseAssignment(std::string_view text) {
    const std::size_t equals = text.find('=');
    if (equals == std::string_view::npos)
        throw std::invalid_argument("--set \"" + std::string(text) + "\" is not NAME=VALUE");
    const std::string_view name = text.substr(0, equals);
    const std::string_view value = text.substr(equals + 1);
    const cParameterInfo* info = findShadowParameter(name);
    if (info == nullptr)
        throw std::invalid_argument("--set: unknown parameter \"" + std::string(name) +
                                    "\" (see --list-parameters)");
    std::string_view digits = value;
    if (digits.starts_with('+')) digits.remove_prefix(1);
    std::int64_t wide = 0;
    const auto [end, error] = std::from_chars(digits.data(), digits.data() + digits.size(), wide);
    const bool doubleSign = value.starts_with('+') && digits.starts_with('-');
    if (digits.empty() || doubleSign || error == std::errc::invalid_argument ||
        end != digits.data() + digits.size())
        throw std::invalid_argument("--set " + std::string(name) + ": \"" + std::string(value) +
                                    "\" is not an integer");
    if (error == std::errc::result_out_of_range || wide < INT32_MIN || wide > INT32_MAX)
        throw std::invalid_argument("--set " + std::string(name) + ": " + std::string(value) +
                                    " is outside the 32-bit integer range");
    return Assignment{std::size_t(info->number), std::int32_t(wide)};
}

std::optional<std::string> composeSettingsText(const std::optional<std::string>& base,
                                               const std::vector<Assignment>& assignments) {
    if (assignments.empty()) return base;
    ParameterValues values = defaultParameterValues();
    if (base && !readSettingsText(*base, values))
        throw std::invalid_argument("--set needs a settings text starting with \"vek \"; the given text would be "
                                    "ignored by the module");
    for (const Assignment& a : assignments) values[a.number] = a.value;
    return writeSettingsText(values);
}

void listParameters(std::ostream& out) {
    out << "| # | name | default | what it does |\n|---|---|---|---|\n";
    for (const cParameterInfo& p : shadowParameterTable())
        out << "| " << p.number << " | `" << p.name << "` | " << p.defaultValue << " | " << p.description << " |\n";
}

}  // namespace noctiva::cli
