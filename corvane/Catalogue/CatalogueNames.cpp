#include <corvane/Catalogue/CatalogueNames.h>

#include <algorithm>

namespace corvane::catalogue {

std::string plainName(std::string_view name) {
    constexpr std::string_view digits = "0123456789ABCDEF";
    std::string plain;
    for (const char c : name) {
        if ((c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') || c == '_') {
            plain += c;
        } else {
            const auto byte = static_cast<unsigned char>(c);
            plain.append({'+', digits[byte >> 4U], digits[byte & 15U]});
        }
    }
    return plain.empty() ? "+" : plain;
}

std::string schemaFileOf(std::string_view event) {
    return plainName(event) + std::string(schemaSuffix);
}

std::vector<std::string> namesOf(const std::vector<Definition>& definitions) {
    std::vector<std::string> names;
    const auto isTaken = [&](const std::string& name) { return std::ranges::find(names, name) != names.end(); };
    for (const Definition& definition : definitions) {
        std::string name(definition.type.name());
        if (isTaken(name)) name = definition.type.qualifiedName();
        const std::string base = name;
        for (int i = 2; isTaken(name); ++i) name = base + " " + std::to_string(i);
        names.push_back(std::move(name));
    }
    return names;
}

}  // namespace corvane::catalogue
