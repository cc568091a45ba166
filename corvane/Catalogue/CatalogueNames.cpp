#include <corvane/Catalogue/CatalogueNames.h>

#include <algorithm>

namespace corvane::catalogue {

std::string schemaFileOf(std::string_view event) {
    constexpr std::string_view digits = "0123456789ABCDEF";
    std::string file;
    for (const char c : event) {
        if ((c >= 'A' && c <= 'Z') || (c >= 'a' && c <= 'z') || (c >= '0' && c <= '9') || c == '_') {
            file += c;
        } else {
            const auto byte = static_cast<unsigned char>(c);
            file.append({'+', digits[byte >> 4U], digits[byte & 15U]});
        }
    }
    return (file.empty() ? "+" : file) + std::string(schemaSuffix);
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
