#include <corvane/c/Processor.h>

#include <corvane/c/Call.h>
#include <corvane/c/Records.h>

namespace corvane::c {

BridgedUploadBatchEventProcessor& ProcessorObject::uploads() const {
    auto* uploads = dynamic_cast<BridgedUploadBatchEventProcessor*>(processor.get());
    if (!uploads) refuse(CORVANE_WRONG_KIND, "a processor is not one that uploads");
    return *uploads;
}

void Processor::processEvent(const BridgedProcessEvent& event) {
    const auto record = recordOf(event);
    tell(callbacks_.process, &record);
}

void Processor::didEnterGroup(const Group& group) {
    tell(callbacks_.did_enter_group, group.name.c_str(), millisecondsSince1970(group.startDate));
}
void Processor::didLeaveGroup(const Group& group) {
    tell(callbacks_.did_leave_group, group.name.c_str(), millisecondsSince1970(group.startDate));
}

void Processor::didStartSession(const BridgedSession& session) {
    const auto record = recordOf(session);
    tell(callbacks_.did_start_session, &record);
}
void Processor::didUpdateSession(const BridgedSession& session, bool submitEventQueues) {
    const auto record = recordOf(session);
    tell(callbacks_.did_update_session, &record, submitEventQueues);
}
void Processor::didEndSession(const BridgedSession& session, Date endDate) {
    const auto record = recordOf(session);
    tell(callbacks_.did_end_session, &record, millisecondsSince1970(endDate));
}

void Processor::didReject(const RejectedEvent& event) {
    const auto error = recordOf(BridgedError::of(event.error));
    tell(callbacks_.did_reject, std::string(event.name).c_str(), static_cast<std::int32_t>(event.reason), &error);
}

ForgottenRecords Processor::forget() {
    ForgottenRecords forgotten;
    tell(callbacks_.forget, &forgotten.events, &forgotten.documents);
    return forgotten;
}

bool Processor::resumeBackgroundProcessingForIdentifier(const std::string& identifier,
                                                        const std::function<void()>& completion) {
    const Lent<TaskObject> task(completion);
    return tell(callbacks_.resume_background, identifier.c_str(), static_cast<corvane_task*>(task.pointer()));
}

}  // namespace corvane::c
