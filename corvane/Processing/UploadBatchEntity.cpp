#include <corvane/Processing/UploadBatchEntity.h>

#include <corvane/Models/JSONShape.h>
#include <corvane/Models/OwnJSON.h>
#include <corvane/Upload/LedgerEntity.h>

#include <algorithm>
#include <utility>

namespace corvane {

namespace {

[[noreturn]] void failBadData(const char* detail) {
    throw StoreStepper::Errors(StoreStepper::Errors::badDataInColumn, detail);
}

// The texts go out as they were written: a number may have more digits than a reader keeps, and a key may be there
// twice. A row that is laid out in another way, which only another program writes, is written anew.
std::shared_ptr<const EncodedEvents> readEvents(std::string bytes) {
    constexpr auto opening = EncodedEvents::opening, closing = EncodedEvents::closing;
    if (const auto count = jsonshape::objectsBetween(bytes, opening, closing)) {
        bytes.resize(bytes.size() - closing.size());
        bytes.erase(0, opening.size());
        return std::make_shared<EncodedEvents>(std::move(bytes), *count);
    }
    const auto events = JSON(bytes)["events"].array();
    if (!events) failBadData("there is no array of events");
    auto encoded = std::make_shared<EncodedEvents>();
    for (const JSON& event : *events) {
        if (!event.isObject()) failBadData("an event is not an object");
        encoded->append(event);
    }
    return encoded;
}

}  // namespace

std::vector<StoreColumn> UploadBatchEntity::columns() {
    return {{.name = "identifier", .type = "TEXT", .nullable = false, .primary = true},
            {.name = "events", .type = "DATA", .nullable = false, .primary = false},
            {.name = "session", .type = "DATA", .nullable = false, .primary = false}};
}

std::vector<UploadBatchEntity::Size> UploadBatchEntity::sizes(StoreConnection& connection) {
    std::vector<Size> sizes;
    connection.query(
        "SELECT identifier, CASE json_valid(text) WHEN 1 THEN json_array_length(text, '$.events') ELSE 0 END, bytes "
        "FROM "
        "(SELECT identifier, CAST(events AS TEXT) AS text, length(events) AS bytes FROM upload_batches);",
        [&](StoreStepper& stepper) {
            Size size{stepper.optionalText().value_or("")};
            size.events = stepper.count();
            size.bytes = stepper.count();
            sizes.push_back(std::move(size));
        });
    return sizes;
}

StoreTableExtras UploadBatchEntity::extras() {
    return {.willForget = [](const std::shared_ptr<StoreConnection>& connection) {
        ForgottenRecords forgotten;
        for (const auto& size : sizes(*connection)) forgotten.events += size.events;
        noteForgotten(connection, forgotten);
        return forgotten;
    }};
}

StorableValue UploadBatchEntity::storableValue(std::string_view columnName) const {
    if (columnName == "identifier") return identifier;
    if (columnName == "events") return events->blob();
    if (columnName == "session") return StorableValue::bytes(session.text());
    return StorableValue::absent();
}

UploadBatchEntity UploadBatchEntity::read(StoreStepper& stepper) {
    std::string identifier = stepper.text();
    auto events = readEvents(stepper.bytes());
    auto session = stepper.bytes();
    if (!JSON(session).isObject()) failBadData("the session is not an object");
    return {std::move(identifier), OwnJSON::of(std::move(session)), std::move(events)};
}

}  // namespace corvane
