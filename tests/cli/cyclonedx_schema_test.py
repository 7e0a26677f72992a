#!/usr/bin/env python3
"""The CycloneDX bill of materials of a run validates against the published 1.6 JSON schema.

Usage: cyclonedx_schema_test.py TRLLOCATOR SCHEMA_DIR
A run over a tree with one identified application and one that two versions fit alike
("Multiple Matches"), with --include-unidentified, is validated, and what it lists is checked.
"""
import json
import os
import subprocess
import sys
import tempfile
import warnings

import jsonschema

trllocator, schema_dir = sys.argv[1], sys.argv[2]


def load(name):
    with open(os.path.join(schema_dir, name), encoding="utf-8") as f:
        return json.load(f)


bom_schema = load("bom-1.6.SNAPSHOT.schema.json")
store = {}
for name in ("spdx.SNAPSHOT.schema.json", "jsf-0.82.SNAPSHOT.schema.json"):
    schema = load(name)
    store["http://cyclonedx.org/schema/" + name] = schema
    if "$id" in schema:
        store[schema["$id"]] = schema
with warnings.catch_warnings():  # the newer referencing API is not in Debian's version
    warnings.simplefilter("ignore", DeprecationWarning)
    resolver = jsonschema.RefResolver.from_schema(bom_schema, store=store)
validator = jsonschema.Draft7Validator(bom_schema, resolver=resolver)

with tempfile.TemporaryDirectory() as root:
    for name, content in (("tool", "one"), ("twin", "same")):
        os.makedirs(os.path.join(root, "apps", name))
        with open(os.path.join(root, "apps", name, name + ".bin"), "w") as f:
            f.write(content)
    version = ("<v v_id='{0}' v_name='{0}.0' v_seq='{0}'><f f_id='1' f_name='{1}.bin' "
               "f_relpath='' f_weight='1'><p p_type='2' p_weight='1' p_value='{2}'/></f></v>")
    with open(os.path.join(root, "fp.xml"), "w") as f:
        f.write("<trl_fingerprint><a a_id='1' a_name='Tool'>" + version.format(1, "tool", 3) +
                version.format(2, "tool", 9) + "</a><a a_id='2' a_name='Twin'>" +
                version.format(1, "twin", 4) + version.format(2, "twin", 4) +
                "</a></trl_fingerprint>")
    run = subprocess.run([trllocator, "locate", os.path.join(root, "apps"), "--fingerprint",
                          os.path.join(root, "fp.xml"), "--sync", "--format", "cyclonedx",
                          "--include-unidentified"], capture_output=True, text=True)
    if run.returncode != 0:
        sys.exit("locate failed: " + run.stderr)
    bom = json.loads(run.stdout)

errors = sorted(validator.iter_errors(bom), key=lambda e: list(e.path))
for error in errors:
    print("schema:", "/".join(map(str, error.path)), error.message, file=sys.stderr)
properties = [{p["name"]: p["value"] for p in c["properties"]} for c in bom["components"]]
listed = sorted((c["name"], c.get("version"), p["trllocator:verdict"], p.get("trllocator:label"),
                 sorted(m["technique"] for m in c["evidence"]["identity"][0]["methods"]))
                for c, p in zip(bom["components"], properties))
# The sizes told the versions apart: "other" beside the names.
expected = [("Tool", "1.0", "identified", None, ["filename", "other"]),
            ("Twin", "1.0", "unidentified", "Multiple Matches", ["filename", "other"])]
if listed != expected:
    print("listed", listed, "expected", expected, file=sys.stderr)
sys.exit(1 if errors or listed != expected else 0)
