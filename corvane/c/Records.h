#pragma once

// Internal: the library's records as structures of the C interface, whose texts are those of the records.

#include <corvane/Bridge/Session/BridgedEventProcessorType.h>
#include <corvane/Upload/DeliveryReport.h>
#include <corvane/Upload/DeliveryUpdate.h>
#include <corvane/Upload/Ledger.h>
#include <corvane/c/corvane.h>

namespace corvane::c {

[[nodiscard]] corvane_process_event recordOf(const BridgedProcessEvent& event);
[[nodiscard]] corvane_session recordOf(const BridgedSession& session);
[[nodiscard]] corvane_delivery_report recordOf(const DeliveryReport& report);
[[nodiscard]] corvane_delivery_update recordOf(const DeliveryUpdate& update);
[[nodiscard]] corvane_ledger recordOf(const Ledger& ledger);

}  // namespace corvane::c
