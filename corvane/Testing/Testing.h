#pragma once

/// What a host needs to test its own instrumentation: link `corvane::testing` to the test program and include this.
/// Nothing here needs a test framework or leaves the machine. Matchers for GoogleMock are in
/// <corvane/Testing/Matchers.h>.

#include <corvane/Testing/CapturedLog.h>
#include <corvane/Testing/FakeTransferSession.h>
#include <corvane/Testing/ManualClock.h>
#include <corvane/Testing/ManualQueue.h>
#include <corvane/Testing/ProcessSettings.h>
#include <corvane/Testing/RecordedEvent.h>
#include <corvane/Testing/RecordingProcessor.h>
#include <corvane/Testing/ScriptedServer.h>
#include <corvane/Testing/TemporaryDocuments.h>
