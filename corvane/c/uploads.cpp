// The batching processor.

#include <corvane/c/Call.h>
#include <corvane/c/Processor.h>
#include <corvane/c/Records.h>
#include <corvane/c/corvane.h>

#include <utility>

using namespace corvane;
using namespace corvane::c;

namespace {

class Headers final : public Object {
  public:
    static constexpr Kind kind = Kind::headers;

    explicit Headers(HTTPHeaders* given) : headers(given) {}

    HTTPHeaders* const headers;  // good for the length of the callback
};

Endpoint endpointOf(const corvane_upload_options& options, Context context) {
    EndpointOptions more;
    more.trustedCertificates = optionalText(options.trusted_certificates, "the certificates' path");
    if (options.headers) {
        more.headers = [callback = Callback<void(void*, corvane_headers*)>(options.headers, std::move(context))] {
            HTTPHeaders headers;
            const Lent<Headers> lent(&headers);
            callback(static_cast<corvane_headers*>(lent.pointer()));
            return headers;
        };
    }
    return {text(options.url, "the URL"), text(options.endpoint, "the endpoint's name"), std::move(more)};
}

UploadBatchEventConfig configOf(const corvane_upload_options& options) {
    UploadBatchEventOptions config;
    if (options.batch_size != 0) config.batchSize = options.batch_size;
    config.batchDebugging = options.batch_debugging;
    if (options.maximum_bytes_on_disk != 0) config.maximumBytesOnDisk = options.maximum_bytes_on_disk;
    config.maximumAge = duration(options.maximum_age, "the maximum age");
    config.maximumDelay = duration(options.maximum_delay, "the maximum delay");
    config.retryDelay = duration(options.retry_delay, "the retry delay");
    if (options.durability == CORVANE_SURVIVES_POWER_CUT) {
        config.durability = Durability::powerCut;
    } else if (options.durability != CORVANE_SURVIVES_KILL) {
        refuse(CORVANE_INVALID_ARGUMENT, "the durability is unknown");
    }
    return UploadBatchEventConfig(config);
}

// Now and so much later; the furthest that a clock can say when that is beyond it.
std::chrono::steady_clock::time_point deadlineAfter(std::int64_t milliseconds) {
    const auto now = std::chrono::steady_clock::now();
    const auto left = std::chrono::floor<std::chrono::milliseconds>(std::chrono::steady_clock::time_point::max() - now);
    return now + std::min(duration(milliseconds, "the timeout").value_or(std::chrono::milliseconds(0)), left);
}

template <class F>
auto uploads(corvane_processor* processor, corvane_error* error, F function) {
    return call(error, [&] {
        const Used<ProcessorObject> used(processor);
        return function(used->uploads());
    });
}

}  // namespace

bool corvane_header_add(corvane_headers* headers, const char* name, const char* value, corvane_error* error) {
    return call(error, [&] {
        Used<Headers>(headers)->headers->emplace_back(text(name, "the header's name"), text(value, "the header"));
    });
}

corvane_processor* corvane_uploads_create(const corvane_upload_options* given, corvane_error* error) {
    corvane_upload_options options{};
    const auto readOptions = [&] {
        if (!given) refuse(CORVANE_NO_OBJECT, "a null pointer stands where there must be the options");
        options = read(given, "the options");
    };
    if (!call(error, readOptions)) return nullptr;
    return call(error, options.context, options.destroy, [&](Context context) {
        const Client client(text(options.identifier, "the application's identifier"),
                            text(options.name, "the application's name"),
                            text(options.version, "the application's version"), options.build);
        auto processor = std::make_shared<BridgedUploadBatchEventProcessor>(
            client, endpointOf(options, std::move(context)), configOf(options));
        return static_cast<corvane_processor*>(make<ProcessorObject>(std::move(processor)));
    });
}

bool corvane_uploads_flush(corvane_processor* processor, corvane_error* error) {
    return uploads(processor, error, [](BridgedUploadBatchEventProcessor& found) { found.flush(); });
}

bool corvane_uploads_wait(corvane_processor* processor, int64_t timeout, uint32_t flags,
                          corvane_delivery_report* report, corvane_error* error) {
    return uploads(processor, error, [&](const BridgedUploadBatchEventProcessor& found) {
        requireMayWait();
        if ((flags & ~std::uint32_t{CORVANE_ONLY_WHILE_REACHABLE}) != 0) {
            refuse(CORVANE_INVALID_ARGUMENT, "a flag of the wait is unknown");
        }
        if (report) requireSize(report->size, sizeof *report, "the report");
        const auto outcome = found.waitForDelivery(deadlineAfter(timeout),
                                                   {.onlyWhileReachable = (flags & CORVANE_ONLY_WHILE_REACHABLE) != 0});
        if (report) write(report, recordOf(outcome), "the report");
    });
}

bool corvane_uploads_ledger(corvane_processor* processor, corvane_ledger* ledger, corvane_error* error) {
    return uploads(processor, error, [&](const BridgedUploadBatchEventProcessor& found) {
        write(ledger, recordOf(found.ledger()), "the ledger");
    });
}

bool corvane_uploads_read_ledger(corvane_processor* processor, corvane_ledger_read done, void* context,
                                 corvane_destroy destroy, corvane_error* error) {
    return call(error, context, destroy, [&](Context owned) {
        const Used<ProcessorObject> used(processor);
        const Callback<void(void*, const corvane_ledger*)> callback(done, std::move(owned));
        used->uploads().readLedger([callback](const Ledger& ledger) {
            const auto record = recordOf(ledger);
            callback(&record);
        });
    });
}

bool corvane_uploads_observe(corvane_processor* processor, corvane_delivery_observer observer, void* context,
                             corvane_destroy destroy, corvane_error* error) {
    return call(error, context, destroy, [&](Context owned) {
        const Used<ProcessorObject> used(processor);
        if (!observer) return used->uploads().setDeliveryObserver({});
        const Callback<void(void*, const corvane_delivery_update*)> callback(observer, std::move(owned), true);
        used->uploads().setDeliveryObserver([callback](const DeliveryUpdate& update) {
            const auto record = recordOf(update);
            callback(&record);
        });
    });
}
