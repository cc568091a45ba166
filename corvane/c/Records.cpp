#include <corvane/c/Records.h>

#include <corvane/Platform/Date.h>

namespace corvane::c {

namespace {

corvane_count recordOf(const DeliveryReport::Count& count) {
    return {count.events, count.documents};
}

}  // namespace

corvane_process_event recordOf(const BridgedProcessEvent& event) {
    const std::string& json = event.json().text();
    return {.size = sizeof(corvane_process_event),
            .name = event.name().c_str(),
            .version = ProcessEvent::version().data(),  // a literal
            .json = json.c_str(),
            .json_length = json.size(),
            .group = event.groupName() ? event.groupName()->c_str() : nullptr};
}

corvane_session recordOf(const BridgedSession& session) {
    const bool isCustom = session.kind() == BridgedSessionKind::custom;
    return {.size = sizeof(corvane_session),
            .identifier = session.identifier().c_str(),
            .kind = static_cast<std::int32_t>(session.kind()),
            .name = isCustom ? session.session().kind.name().c_str() : nullptr,
            .start = millisecondsSince1970(session.startDate()),
            .json = session.sessionData().text().c_str()};
}

corvane_delivery_report recordOf(const DeliveryReport& report) {
    return {.size = sizeof(corvane_delivery_report),
            .delivered = recordOf(report.delivered),
            .pending = recordOf(report.pending),
            .given_up = recordOf(report.givenUp)};
}

corvane_delivery_update recordOf(const DeliveryUpdate& update) {
    return {.size = sizeof(corvane_delivery_update),
            .step = static_cast<std::int32_t>(update.step),
            .reason = static_cast<std::int32_t>(update.cause.reason),
            .document = update.document.c_str(),
            .events = update.events.value_or(-1),
            .status = update.cause.status.value_or(0),
            .problem = update.cause.problem.c_str(),
            .bytes_sent = update.bytesSent,
            .bytes_expected = update.bytesExpected};
}

corvane_ledger recordOf(const Ledger& ledger) {
    return {.size = sizeof(corvane_ledger),
            .open = recordOf(ledger.open),
            .waiting = recordOf(ledger.waiting),
            .delivered = recordOf(ledger.delivered),
            .refused_4xx = recordOf(ledger.refused.status4xx),
            .refused_3xx = recordOf(ledger.refused.status3xx),
            .refused_other = recordOf(ledger.refused.other),
            .given_up_attempts = recordOf(ledger.givenUp.attempts),
            .given_up_age = recordOf(ledger.givenUp.age),
            .given_up_size = recordOf(ledger.givenUp.size),
            .given_up_payload_missing = recordOf(ledger.givenUp.payloadMissing),
            .given_up_forgotten = recordOf(ledger.givenUp.forgotten),
            .unknown = recordOf(ledger.unknown),
            .sent_again = recordOf(ledger.sentAgain),
            .rejected_no_session = ledger.notAccepted.noSession,
            .rejected_missing_data = ledger.notAccepted.missingData,
            .rejected_encoding = ledger.notAccepted.encoding,
            .rejected_not_recording = ledger.notAccepted.notRecording,
            .rejected_other = ledger.notAccepted.other,
            .accepted_in_run = ledger.acceptedInRun,
            .unaccounted = ledger.unaccounted};
}

}  // namespace corvane::c
