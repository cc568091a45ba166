// Processors of the host's, and those of the library's that look at events.

#include <corvane/Bridge/Logging/BridgingLoggingEventProcessor.h>
#include <corvane/Bridge/Session/BridgingFilteringEventProcessor.h>
#include <corvane/Bridge/Session/BridgingSamplingEventProcessor.h>
#include <corvane/c/Call.h>
#include <corvane/c/Processor.h>
#include <corvane/c/Records.h>
#include <corvane/c/Value.h>
#include <corvane/c/corvane.h>

using namespace corvane;
using namespace corvane::c;

namespace {

corvane_processor* made(std::shared_ptr<BridgedEventProcessorType> processor) {
    return static_cast<corvane_processor*>(make<ProcessorObject>(std::move(processor)));
}

using FormatterCallback = Callback<void(void*, const corvane_process_event*, corvane_text*)>;
using FilterCallback = Callback<std::int32_t(void*, const corvane_process_event*, corvane_text*)>;

BridgingLoggingEventProcessor::Formatter libraryFormatter(const FormatterCallback& formatter) {
    if (!formatter) return {};
    return [formatter](const BridgedProcessEvent& event) {
        const auto record = recordOf(event);
        std::string line;
        const Lent<Text> text(&line);
        formatter(&record, static_cast<corvane_text*>(text.pointer()));
        return line;
    };
}

// The text of a callback is its own, compact, and has its keys in their places.
JSON replacementOf(const std::string& json) {
    return detail::toJsonObject(dictionaryOf(valueOf(json)));
}

BridgingFilteringEventProcessor::Filter libraryFilter(const FilterCallback& filter) {
    if (!filter) return {};
    return [filter](const BridgedProcessEvent& event) -> std::optional<BridgedProcessEvent> {
        const auto record = recordOf(event);
        std::string json;
        const Lent<Text> text(&json);
        switch (filter(&record, static_cast<corvane_text*>(text.pointer()))) {
            case CORVANE_KEEP:
                return event;
            case CORVANE_REPLACE:
                return BridgedProcessEvent(ProcessEvent(event.name(), replacementOf(json), event.groupName()));
            default:
                return std::nullopt;
        }
    };
}

}  // namespace

corvane_processor* corvane_processor_create(const corvane_processor_callbacks* callbacks, void* context,
                                            corvane_destroy destroy, corvane_error* error) {
    return call(error, context, destroy, [&](Context owned) {
        if (!callbacks) refuse(CORVANE_NO_OBJECT, "a null pointer stands where there must be the callbacks");
        return made(std::make_shared<Processor>(read(callbacks, "the callbacks"), std::move(owned)));
    });
}

bool corvane_task_run(corvane_task* task, corvane_error* error) {
    return call(error, [&] {
        const Used<TaskObject> used(task);
        if (used->isDone.exchange(true)) refuse(CORVANE_IN_USE, "a task was run before");
        used->task();
    });
}

bool corvane_text_set(corvane_text* text, const char* utf8, corvane_error* error) {
    return call(error, [&] { *Used<Text>(text)->text = c::text(utf8, "the text"); });
}

corvane_processor* corvane_logging_create(int32_t format, corvane_formatter formatter, void* context,
                                          corvane_destroy destroy, corvane_error* error) {
    return call(error, context, destroy, [&](Context owned) {
        return made(std::make_shared<BridgingLoggingEventProcessor>(
            static_cast<BridgedLoggingEventProcessorFormat>(format), libraryFormatter({formatter, std::move(owned)})));
    });
}

corvane_processor* corvane_sampling_create(corvane_processor* processor, int32_t keep_one_in, corvane_error* error) {
    return call(error, [&] {
        const Used<ProcessorObject> used(processor);
        return made(std::make_shared<BridgingSamplingEventProcessor>(used->processor, keep_one_in));
    });
}

corvane_processor* corvane_filtering_create(corvane_processor* processor, corvane_filter filter, void* context,
                                            corvane_destroy destroy, corvane_error* error) {
    return call(error, context, destroy, [&](Context owned) {
        const Used<ProcessorObject> used(processor);
        return made(std::make_shared<BridgingFilteringEventProcessor>(used->processor,
                                                                      libraryFilter({filter, std::move(owned)})));
    });
}
