"""The JSON Schema of the classes: the one in docs/schema is the one that the program prints, and the
instances of every example are as it says.

Usage: schema_test.py PROGRAM SOURCE_TREE; exit status 77 where python3-jsonschema is missing."""

import json
import pathlib
import subprocess
import sys

try:
    import jsonschema
except ImportError:
    print("skipped: python3-jsonschema is missing")
    sys.exit(77)

program, tree = sys.argv[1], pathlib.Path(sys.argv[2])
printed = subprocess.run([program, "classes", "--schema"], check=True, capture_output=True).stdout
shipped = tree / "docs/schema/classes.json"
if printed != shipped.read_bytes():
    sys.exit(f"{shipped} is not what the plug-ins declare; make it anew: ipmisel classes --schema")

schema = json.loads(printed)
jsonschema.Draft202012Validator.check_schema(schema)
# Readers take properties that they do not know; the plug-ins declare all that they write.
for definition in schema["$defs"].values():
    definition["properties"]["properties"]["additionalProperties"] = False
validators = {
    name: jsonschema.Draft202012Validator(definition,
                                          format_checker=jsonschema.FormatChecker())
    for name, definition in schema["$defs"].items()
}

seen = set()
for example in sorted((tree / "examples").glob("*.json")):
    # All classes, those too that have to be named.
    command = [program, "collect", "--from", f"sim:{example}", "--format", "json",
               "--log-level", "error"]
    for name in validators:
        command += ["--class", name]
    report = json.loads(subprocess.run(command, capture_output=True).stdout)
    for instance in report["instances"]:
        seen.add(instance["class"])
        for error in validators[instance["class"]].iter_errors(instance):
            sys.exit(f"{example.name}: {instance['class']}: {error.message}")
print("instances of", ", ".join(sorted(seen)))
