"""Typed records of what the program ipmisel reads from a server's management controller.

    import ipmisel

    for event in ipmisel.collect("lan:bmc17", options=["--user", "monitor"]):
        if event.severity >= ipmisel.Severity.WARNING:
            print(event.time, event.sentence)

The program is run with --format events, and its lines become records as they come. `read` does the same
for lines that were saved.
"""

import dataclasses
import datetime
import enum
import json
import subprocess
import tempfile
from typing import Any, Iterable, Iterator, Mapping, Optional, Sequence, Union

FORMAT = "ipmisel/1"
_PARTIAL = 4  # exit status: collected in part


class Severity(enum.IntEnum):
    """How bad an event is; a worse one is greater."""

    INFORMATION = 0
    OK = 1
    WARNING = 2
    CRITICAL = 3
    FATAL = 4


@dataclasses.dataclass(frozen=True)
class Event:
    """One record of an event log. What the line does not say is None."""

    system: str
    guid: Optional[str]
    collected: Optional[datetime.datetime]
    key: str  # the same record has the same key in every report
    node: int  # from 1
    record_id: int
    time: Optional[datetime.datetime]  # by the clock of the controller
    corrected_time: Optional[datetime.datetime]  # by that of the collecting machine
    severity: Optional[Severity]
    state: Optional[str]
    sensor_type: Optional[str]
    part: Optional[str]
    text: str
    sentence: str
    raw: bytes
    properties: Mapping[str, Any]  # everything that the line says, by its own names


@dataclasses.dataclass(frozen=True)
class Summary:
    """The last line of a system: whether the report is whole, and what was counted."""

    system: str
    complete: bool
    counts: Mapping[str, int]
    details: Mapping[str, Any]


class Error(Exception):
    """Nothing was collected, or the lines are not what this module reads."""


class PartialReport(Error):
    """The report is not whole; `summaries` say what is missing."""

    def __init__(self, message: str, summaries: Sequence[Summary]):
        super().__init__(message)
        self.summaries = summaries


def _time(text: Optional[str]) -> Optional[datetime.datetime]:
    # Until Python 3.11 fromisoformat does not know the letter.
    return None if text is None else datetime.datetime.fromisoformat(text.replace("Z", "+00:00"))


def _record(line: str) -> Union[Event, Summary]:
    try:
        said = json.loads(line)
        if said["format"] != FORMAT:
            raise Error(f"the lines are of format {said['format']}, not {FORMAT}")
        if "summary" in said:
            summary = said["summary"]
            return Summary(said["system"], summary["complete"], summary.get("counts", {}), summary)
        severity = said.get("Severity")
        return Event(
            system=said["system"], guid=said.get("guid"), collected=_time(said.get("collected")),
            key=said["Key"], node=said["Node"], record_id=said["RecordID"], time=_time(said.get("Time")),
            corrected_time=_time(said.get("CorrectedTime")),
            severity=None if severity is None else Severity[severity.upper()], state=said.get("State"),
            sensor_type=said.get("SensorType"), part=said.get("Part"), text=said.get("Text", ""),
            sentence=said.get("Sentence", ""), raw=bytes.fromhex(said.get("Raw", "")), properties=said)
    except (KeyError, TypeError, ValueError) as error:
        raise Error(f"no line of an events report ({error!r}): {line[:80]}") from error


def read(lines: Iterable[str]) -> Iterator[Union[Event, Summary]]:
    """The records of an events report, line by line. Raises Error for a line that is none."""
    return (_record(line) for line in lines if line.strip())


def collect(*sources: str, options: Sequence[str] = (), program: str = "ipmisel",
            allow_partial: bool = False) -> Iterator[Event]:
    """Runs the program and yields the events of the sources ("lan:HOST", "sim:FILE"; none: this machine).

    When all events have come, raises PartialReport where a report is not whole, unless that is allowed, and
    Error with the program's own words where nothing could be collected.
    """
    command = [program, "collect", "--format", "events", *options]
    for source in sources:
        command += ["--from", source]
    summaries = []
    with tempfile.TemporaryFile("w+", encoding="utf-8", errors="replace") as words:
        with subprocess.Popen(command, stdout=subprocess.PIPE, stderr=words, text=True,
                              encoding="utf-8") as running:
            try:
                for record in read(running.stdout):
                    if isinstance(record, Summary):
                        summaries.append(record)
                    else:
                        yield record
            except BaseException:
                running.terminate()  # also when the caller has seen enough
                raise
        words.seek(0)
        message = words.read().strip() or f"{program} ended with status {running.returncode}"
    if running.returncode not in (0, _PARTIAL):
        raise Error(message)
    whole = running.returncode == 0 and summaries and all(summary.complete for summary in summaries)
    if not whole and not allow_partial:
        raise PartialReport(message, summaries)
