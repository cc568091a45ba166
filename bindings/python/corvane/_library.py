"""The C library: where it is found, its structures and the types of its functions."""

import ctypes
import os
from ctypes import c_bool, c_char, c_char_p, c_int32, c_int64, c_size_t, c_uint32, c_void_p
from pathlib import Path
from typing import Any

# Of each function: what it takes, and what it returns. Errors come last, as addresses.
#   h an object   s text   b a truth value   i, I 32 bits   q, Q 64 bits   z a size   p a pointer or a function   - nothing
_SIGNATURES = """
    version -s
    retain h-h
    release h--
    callbacks_stop pp-b
    event_create sp-h
    event_require hssp-b
    event_allow hssp-b
    sessions_create p-h
    sessions_start hisp-b
    sessions_end hpppp-b
    sessions_end_and_wait hp-b
    sessions_push_json hssspp-b
    sessions_transaction hpppp-b
    session_access_is_active hp-b
    session_access_push hsshpp-b
    value_from_json sp-h
    sessions_set_recording hbpppp-b
    sessions_is_recording hp-b
    sessions_forget hpppp-b
    sessions_waiting_count hp-Q
    sessions_suspend hp-b
    sessions_resume hp-b
    sessions_add_processor hhp-b
    sessions_remove_processor hhp-b
    sessions_resume_background hspppp-b
    sessions_tracker hp-h
    tracker_chain hsp-h
    tracker_path hzp-s
    tracker_push_json hsspp-b
    tracker_pop hsp-b
    tracker_submit hhpp-b
    tracker_submit_later hhpp-h
    delayed_commit hp-b
    tracker_time hhpp-b
    tracker_enter_group hsp-b
    tracker_leave_group hp-b
    tracker_transaction hpppp-b
    tracker_when_session hpppp-b
    access_push_json hsspp-b
    access_pop hsp-b
    access_submit hhpp-b
    access_time hhpp-b
    tracker_observe hpppp-h
    tracker_snapshot hip-h
    snapshot_evaluate hhp-h
    evaluation_is_valid hp-b
    evaluation_property hzpp-b
    processor_create pppp-h
    task_run hp-b
    text_set hsp-b
    logging_create ipppp-h
    sampling_create hip-h
    filtering_create hpppp-h
    header_add hssp-b
    uploads_create pp-h
    uploads_flush hp-b
    uploads_wait hqIpp-b
    uploads_ledger hpp-b
    uploads_read_ledger hpppp-b
    uploads_observe hpppp-b
    log_set_level ip-b
    log_set_hides_private bp-b
    log_set_sink pppp-b
    documents_directory_set sp-b
    documents_directory_get pzp-z
    main_queue_set_executor pppp-b
    transfers_agent_is_available p-b
    transfers_use_agent pp-b
    transfers_use_in_process p-b
    transfers_use_default p-b
"""

_TYPES = {
    "h": c_void_p,
    "p": c_void_p,
    "s": c_char_p,
    "b": c_bool,
    "i": c_int32,
    "I": c_uint32,
    "q": c_int64,
    "Q": ctypes.c_uint64,
    "z": c_size_t,
    "-": None,
}


def _find() -> str:
    named = os.environ.get("CORVANE_LIBRARY")
    if named:
        return named
    packaged = Path(__file__).parent / "lib" / "libcorvane_c.so"
    if not packaged.exists():
        raise ImportError(f"{packaged} is missing: install the package, or name a library in CORVANE_LIBRARY")
    return str(packaged)


def _load() -> ctypes.CDLL:
    path = _find()
    try:
        library = ctypes.CDLL(path)
        for line in _SIGNATURES.strip().splitlines():
            name, types = line.split()
            function = getattr(library, "corvane_" + name)
            function.argtypes = [_TYPES[letter] for letter in types[:-2]]
            function.restype = _TYPES[types[-1]]
    except (OSError, AttributeError) as error:
        raise ImportError(f"the library of Corvane cannot be used: {error}") from error
    return library


library = _load()


class _Sized(ctypes.Structure):
    """A structure that begins with its size."""

    def __init__(self, **members: Any) -> None:
        super().__init__(ctypes.sizeof(type(self)), **members)


class CError(_Sized):
    _fields_ = [("size", c_size_t), ("code", c_int32), ("domain", c_char * 60), ("message", c_char * 1024)]


class CProcessEvent(_Sized):
    _fields_ = [
        ("size", c_size_t),
        ("name", c_char_p),
        ("version", c_char_p),
        ("json", c_char_p),
        ("json_length", c_size_t),
        ("group", c_char_p),
    ]


class CSession(_Sized):
    _fields_ = [
        ("size", c_size_t),
        ("identifier", c_char_p),
        ("kind", c_int32),
        ("name", c_char_p),
        ("start", c_int64),
        ("json", c_char_p),
    ]


class CSessionDataOptions(_Sized):
    _fields_ = [("size", c_size_t), ("traits", c_uint32), ("submit_queues", c_bool)]


class CPushOptions(_Sized):
    _fields_ = [("size", c_size_t), ("traits", c_uint32), ("file", c_char_p), ("line", c_uint32)]


class CSubmitOptions(_Sized):
    _fields_ = [
        ("size", c_size_t),
        ("only_if_timed", c_bool),
        ("has_time", c_bool),
        ("time", c_int64),
        ("completion", c_void_p),
        ("context", c_void_p),
        ("destroy", c_void_p),
    ]


class CTimerOptions(_Sized):
    _fields_ = [("size", c_size_t), ("has_start", c_bool), ("start", c_int64), ("restart_with_session", c_bool)]


class CEvaluated(_Sized):
    _fields_ = [
        ("size", c_size_t),
        ("property", c_char_p),
        ("is_optional", c_bool),
        ("is_missing", c_bool),
        ("json", c_char_p),
    ]


class CProcessorCallbacks(_Sized):
    _fields_ = [("size", c_size_t)] + [
        (name, c_void_p)
        for name in (
            "process",
            "did_start_session",
            "did_update_session",
            "did_end_session",
            "did_enter_group",
            "did_leave_group",
            "did_reject",
            "forget",
            "resume_background",
        )
    ]


class CUploadOptions(_Sized):
    _fields_ = [
        ("size", c_size_t),
        ("identifier", c_char_p),
        ("name", c_char_p),
        ("version", c_char_p),
        ("build", c_int64),
        ("url", c_char_p),
        ("endpoint", c_char_p),
        ("trusted_certificates", c_char_p),
        ("batch_size", c_int32),
        ("batch_debugging", c_bool),
        ("maximum_bytes_on_disk", c_int64),
        ("maximum_age", c_int64),
        ("maximum_delay", c_int64),
        ("retry_delay", c_int64),
        ("durability", c_int32),
        ("headers", c_void_p),
        ("context", c_void_p),
        ("destroy", c_void_p),
    ]


class CCount(ctypes.Structure):
    _fields_ = [("events", c_int64), ("documents", c_int64)]


class CDeliveryReport(_Sized):
    _fields_ = [("size", c_size_t), ("delivered", CCount), ("pending", CCount), ("given_up", CCount)]


class CLedger(_Sized):
    _fields_ = (
        [("size", c_size_t)]
        + [
            (name, CCount)
            for name in (
                "open",
                "waiting",
                "delivered",
                "refused_4xx",
                "refused_3xx",
                "refused_other",
                "given_up_attempts",
                "given_up_age",
                "given_up_size",
                "given_up_payload_missing",
                "given_up_forgotten",
                "unknown",
                "sent_again",
            )
        ]
        + [
            (name, c_int64)
            for name in (
                "rejected_no_session",
                "rejected_missing_data",
                "rejected_encoding",
                "rejected_not_recording",
                "rejected_other",
                "accepted_in_run",
                "unaccounted",
            )
        ]
    )


class CDeliveryUpdate(_Sized):
    _fields_ = [
        ("size", c_size_t),
        ("step", c_int32),
        ("reason", c_int32),
        ("document", c_char_p),
        ("events", c_int64),
        ("status", c_int64),
        ("problem", c_char_p),
        ("bytes_sent", c_int64),
        ("bytes_expected", c_int64),
    ]


class CAgentOptions(_Sized):
    _fields_ = [("size", c_size_t), ("program", c_char_p), ("directory", c_char_p), ("wake_command", c_void_p)] + [
        (name, c_int64)
        for name in ("deadline", "hold_off", "idle_time", "retry_delay", "patience", "patience_without_host")
    ]
