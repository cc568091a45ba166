#pragma once

/// Everything that a host uses. Includes the standard library and Corvane's own headers, and nothing else.

#include <corvane/Export.h>

#ifndef CORVANE_CANNOT_BE_COMPILED  // it has said why, in one sentence

#include <corvane/Agent/Host/BackgroundTransferSession.h>
#include <corvane/Models/Client.h>
#include <corvane/Models/DataEvent.h>
#include <corvane/Models/Decoding.h>
#include <corvane/Models/EventData.h>
#include <corvane/Models/ProcessEvent.h>
#include <corvane/Models/Session.h>
#include <corvane/Models/SessionData.h>
#include <corvane/Platform/DocumentsDirectory.h>
#include <corvane/Platform/Log.h>
#include <corvane/Platform/MainQueue.h>
#include <corvane/Processing/FilteringEventProcessor.h>
#include <corvane/Processing/LoggingEventProcessor.h>
#include <corvane/Processing/ProcessorManager.h>
#include <corvane/Processing/SamplingEventProcessor.h>
#include <corvane/Processing/UploadBatchEventProcessor.h>
#include <corvane/Session/SessionManager.h>
#include <corvane/Signing/SigningError.h>
#include <corvane/Signing/SigningServiceType.h>
#include <corvane/Snapshot/SnapshotType.h>
#include <corvane/Tracker/AccessTracker.h>
#include <corvane/Tracker/SessionObserver.h>
#include <corvane/Tracker/Tracker.h>
#include <corvane/Transfer/InProcessTransferSession.h>
#include <corvane/Transfer/TransferError.h>
#include <corvane/Upload/Endpoint.h>
#include <corvane/Upload/ExternalAnalyticsUploader.h>
#include <corvane/Upload/Ledger.h>

#endif
