"""Typed records of what the program ipmisel reads from a server's management controller.

    import ipmisel

    for event in ipmisel.collect("lan:bmc17", options=["--user", "monitor"]):
        print(event.time, event.severity, event.sentence)

    report = ipmisel.load("report.json")  # of ipmisel collect --format json
    for finding in report.instances_of("IPMI_Finding"):
        print(finding["Severity"].name, finding["Title"], finding.get("PartNumber"))

`collect` runs the program with --format events, and its lines become records as they come; `read` does the
same for lines that were saved. Times are datetimes in UTC, raw bytes are bytes, lists are tuples, severities
are ordered. What is not known is None in a field and left out of a mapping. The names of the properties and
their meaning: ipmisel classes --schema."""
import dataclasses
import datetime
import enum
import json
import subprocess
import tempfile
from typing import Any, Iterable, Iterator, Mapping, Optional, Sequence, Tuple, Union

FORMAT = "ipmisel/1"
_PARTIAL = 4  # exit status: collected in part
_TIMES = frozenset(("collected", "Time", "CorrectedTime", "ResolvedTime", "FirstTime", "LastTime", "LastAddition",
                    "LastErase", "BoardManufactured"))


class Severity(enum.IntEnum):
    """How bad an event is; a worse one is greater."""
    INFORMATION, OK, WARNING, CRITICAL, FATAL = range(5)


@dataclasses.dataclass(frozen=True)
class Event:
    """One record of an event log."""
    system: str
    key: str  # the same record has the same key in every report
    node: int  # from 1
    record_id: int
    guid: Optional[str]
    collected: Optional[datetime.datetime]
    time: Optional[datetime.datetime]  # by the clock of the controller
    corrected_time: Optional[datetime.datetime]  # by that of the collecting machine
    severity: Optional[Severity]
    part: Optional[str]
    text: Optional[str]
    sentence: Optional[str]
    raw: Optional[bytes]
    properties: Mapping[str, Any]  # all that the line says, by its own names, with types


@dataclasses.dataclass(frozen=True)
class Summary:
    """The last line of a system: whether its report is whole."""
    system: Optional[str]  # None where there is none to read
    complete: bool
    details: Mapping[str, Any]  # what was counted, and what is missing


@dataclasses.dataclass(frozen=True)
class Report:
    """A report of --format json. `instances` are class and properties, in the order of the report."""
    collected: datetime.datetime
    complete: bool
    systems: Sequence[Mapping[str, str]]
    instances: Sequence[Tuple[str, Mapping[str, Any]]]
    details: Mapping[str, Any]  # the report as it was written: source, plug-ins, completeness ...

    def instances_of(self, name: str) -> Iterator[Mapping[str, Any]]:
        return (properties for class_name, properties in self.instances if class_name == name)


class Error(Exception):
    """Nothing was collected, or the text is not what this module reads."""


class PartialReport(Error):
    """The report is not whole; `summaries` say what is missing."""
    summaries: Sequence[Summary] = ()


def _typed(name: str, value: Any) -> Any:
    if name in _TIMES:  # until Python 3.11 fromisoformat does not know the letter
        return datetime.datetime.fromisoformat(value.replace("Z", "+00:00"))
    if name == "Severity":
        return Severity[value.upper()]
    if name in ("Raw", "RawData"):
        return bytes.fromhex(value) if name == "Raw" else bytes(value)
    return tuple(value) if isinstance(value, list) else value


def _parsed(text: str, what: str) -> Union[Event, Summary, Report]:
    try:
        said = json.loads(text)
        if said["format"] != FORMAT:
            raise Error(f"the format is {said['format']}, not {FORMAT}")
        if what == "report":
            instances = [(each["class"], {name: _typed(name, value) for name, value in each["properties"].items()})
                         for each in said["instances"]]
            return Report(_typed("collected", said["collected"]), said["complete"], said["systems"], instances, said)
        if "summary" in said:
            return Summary(said.get("system"), said["summary"]["complete"], said["summary"])
        known = {name: _typed(name, value) for name, value in said.items()}
        return Event(*map(known.__getitem__, ("system", "Key", "Node", "RecordID")),
                     *map(known.get, ("guid", "collected", "Time", "CorrectedTime", "Severity", "Part", "Text",
                                      "Sentence", "Raw")), known)
    except (AttributeError, KeyError, TypeError, ValueError) as error:
        raise Error(f"no {what} ({error!r}): {text[:80]}") from error


def read(lines: Iterable[str]) -> Iterator[Union[Event, Summary]]:
    """The records of an events report, line by line. Raises Error for a line that is none."""
    return (_parsed(line, "line of an events report") for line in lines if line.strip())


def load(path: str) -> Report:
    """A saved report of --format json. Raises OSError, or Error for a file that holds none."""
    with open(path, encoding="utf-8", errors="replace") as file:
        return _parsed(file.read(), "report")


def collect(*sources: str, options: Sequence[str] = (), program: str = "ipmisel",
            allow_partial: bool = False) -> Iterator[Event]:
    """Runs the program and yields the events of the sources ("lan:HOST", "sim:FILE"; none: this machine).

    Then raises PartialReport where a report is not whole, unless that is allowed; raises Error with the program's
    own words where nothing could be collected."""
    command = [program, "collect", "--format", "events", *options, *(f"--from={source}" for source in sources)]
    summaries = []
    with tempfile.TemporaryFile("w+", encoding="utf-8", errors="replace") as words:
        with subprocess.Popen(command, stdout=subprocess.PIPE, stderr=words, encoding="utf-8") as running:
            try:
                for record in read(running.stdout):
                    if isinstance(record, Event):
                        yield record
                    else:
                        summaries.append(record)
            except BaseException:
                running.terminate()  # also when the caller has seen enough
                raise
        words.seek(0)
        message = words.read().strip() or f"{program} ended with status {running.returncode}"
    if running.returncode not in (0, _PARTIAL):
        raise Error(message)
    if not allow_partial and (running.returncode == _PARTIAL or not all(each.complete for each in summaries)):
        partial = PartialReport(message)
        partial.summaries = summaries
        raise partial
