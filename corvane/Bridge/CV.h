#pragma once

/// The object-facing API: what a host includes that drives the library through objects and names known at run time,
/// such as a plug-in or the binding of a scripting language. Hosts that declare their events as types include
/// <corvane/corvane.h> instead and pay nothing for this. Each name below stands for the class that its header
/// documents.

#include <corvane/Export.h>

#ifndef CORVANE_CANNOT_BE_COMPILED  // it has said why, in one sentence

#include <corvane/Bridge/Data/BridgedAccessTracker.h>
#include <corvane/Bridge/Data/BridgedDataEventClass.h>
#include <corvane/Bridge/Data/BridgedEventClass.h>
#include <corvane/Bridge/Data/BridgedRawEvent.h>
#include <corvane/Bridge/Data/BridgedTracker.h>
#include <corvane/Bridge/Logging/BridgingLoggingEventProcessor.h>
#include <corvane/Bridge/Models/BridgedDataEventType.h>
#include <corvane/Bridge/Models/BridgedError.h>
#include <corvane/Bridge/Models/BridgedEventData.h>
#include <corvane/Bridge/Models/HostValue.h>
#include <corvane/Bridge/Session/BridgedSessionManager.h>
#include <corvane/Bridge/Session/BridgingFilteringEventProcessor.h>
#include <corvane/Bridge/Session/BridgingSamplingEventProcessor.h>
#include <corvane/Bridge/Upload/BridgedUploadBatchEventProcessor.h>

namespace corvane {

// What a host implements.
using CVEventProcessorType = BridgedEventProcessorType;
using CVEventType = BridgedEventType;
using CVDataEventType = BridgedDataEventType;
using CVDataType = BridgedDataType;
using CVEndpointType = EndpointType;

// Sessions, and what leaves them.
using CVSessionManager = BridgedSessionManager;
using CVAccessSessionManager = BridgedAccessSessionManager;
using CVProcessorManager = BridgedProcessorManager;
using CVSessionObserver = BridgedSessionObserver;
using CVSession = BridgedSession;
using CVSessionKind = BridgedSessionKind;
using CVSessionData = BridgedSessionData;
using CVSessionChange = SessionChange;
using CVUploadBatchEventProcessor = BridgedUploadBatchEventProcessor;
using CVUploadBatchEventConfig = UploadBatchEventConfig;
using CVUploadBatchEventOptions = UploadBatchEventOptions;
using CVLoggingEventProcessor = BridgingLoggingEventProcessor;
using CVLoggingEventProcessorFormat = BridgedLoggingEventProcessorFormat;
using CVSamplingEventProcessor = BridgingSamplingEventProcessor;
using CVFilteringEventProcessor = BridgingFilteringEventProcessor;
using CVDeliveryUpdate = DeliveryUpdate;
using CVDeliveryObserver = DeliveryObserver;
using CVDeliveryReport = DeliveryReport;
using CVDeliveryWaitOptions = DeliveryWaitOptions;
using CVLedger = Ledger;
using CVRejectedEvent = RejectedEvent;
using CVForgottenRecords = ForgottenRecords;
using CVClient = Client;
using CVEndpoint = Endpoint;

// Trackers, and what is recorded with them.
using CVTracker = BridgedTracker;
using CVAccessTracker = BridgedAccessTracker;
using CVDelayedToken = DelayedToken;
using CVGroup = Group;
using CVEventClass = BridgedEventClass;
using CVEventProperty = BridgedEventProperty;
using CVEventPropertyRequirement = BridgedEventPropertyRequirement;
using CVRawEvent = BridgedRawEvent;
using CVRawEventProperty = BridgedRawEventProperty;
using CVDataEventClass = BridgedDataEventClass;
using CVRawDataEvent = BridgedRawDataEvent;
using CVDataEventTraits = BridgedDataEventTraits;
using CVEventData = BridgedEventData;
using CVTimedData = BridgedTimedData;
using CVProcessEvent = BridgedProcessEvent;
using CVSubmitCompletion = BridgedSubmitCompletion;

// Values.
using CVJSON = JSON;
using CVValue = HostValue;
using CVArray = HostValue::Array;
using CVDictionary = HostValue::Dictionary;
using CVError = BridgedError;

}  // namespace corvane

#endif
