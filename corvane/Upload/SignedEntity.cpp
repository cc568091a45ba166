#include <corvane/Upload/SignedEntity.h>

namespace corvane {

namespace {

Date readDate(StoreStepper& stepper) {
    const auto date = dateFromSeconds(stepper.double_());
    if (!date) throw StoreStepperError(StoreStepperError::badDataInColumn, "no date can hold the number of seconds");
    return *date;
}

}  // namespace

std::vector<StoreColumn> SignedEntity::columns() {
    return {{"identifier", "TEXT", false, true},   {"createdDate", "DOUBLE", false, false},
            {"contentType", "TEXT", false, false}, {"userAgent", "TEXT", false, false},
            {"retries", "INTEGER", false, false},  {"retryAfterDate", "DOUBLE", false, false},
            {"signature", "TEXT", true, false}};
}

SignedEntity SignedEntity::read(StoreStepper& stepper) {
    SignedEntity entity;
    entity.identifier = stepper.text();
    entity.createdDate = readDate(stepper);
    entity.contentType = stepper.text();
    entity.userAgent = stepper.text();
    entity.retries = stepper.integer();
    entity.retryAfterDate = readDate(stepper);
    entity.signature = stepper.optionalText();
    return entity;
}

StorableValue SignedEntity::storableValue(std::string_view columnName) const {
    if (columnName == "identifier") return identifier;
    if (columnName == "createdDate") return secondsSince1970(createdDate);
    if (columnName == "contentType") return contentType;
    if (columnName == "userAgent") return userAgent;
    if (columnName == "retries") return retries;
    if (columnName == "retryAfterDate") return secondsSince1970(retryAfterDate);
    return signature;
}

}  // namespace corvane
