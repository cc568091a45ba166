#pragma once

#include <corvane/Catalogue/CatalogueComparison.h>

#include <boost/json/value.hpp>

#include <set>
#include <string>
#include <utility>
#include <vector>

// Internal.

namespace corvane::catalogue {

/// Compares two schemas of one event, keyword by keyword, as far as the catalogue writes them.
class SchemaComparison {
  public:
    /// @param before, after the files' contents, which references are looked up in; they outlive this
    SchemaComparison(std::string event, const boost::json::value& before, const boost::json::value& after,
                     std::vector<CatalogueChange>& changes)
        : event_(std::move(event)), before_(before), after_(after), changes_(changes) {}

    /// Adds what has changed between two parts of the files, which stand at `path` of the event.
    void compare(const boost::json::value* before, const boost::json::value* after, const std::string& path);

  private:
    using Object = boost::json::object;

    void add(const std::string& path, std::string what, bool isBreaking);
    void compareType(const Object& before, const Object& after, const std::string& path);
    void compareBound(const char* keyword, bool isLower, const Object& before, const Object& after,
                      const std::string& path);
    void compareEnumeration(const Object& before, const Object& after, const std::string& path);
    void compareFields(const Object& before, const Object& after, const std::string& path);
    void compareField(const Object& before, const Object& after, const std::string& name, const std::string& path);
    void compareRest(const Object& before, const Object& after, const std::string& path);

    const std::string event_;
    const boost::json::value& before_;
    const boost::json::value& after_;
    std::vector<CatalogueChange>& changes_;
    std::set<std::pair<const boost::json::value*, const boost::json::value*>> isBeingCompared_;
};

}  // namespace corvane::catalogue
