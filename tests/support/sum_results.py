"""Print "N passed, N failed" over the result files of ctest and GoogleTest in a folder and of pytest in its folder
e2e. Exit 1 when a test failed, or when there are no results of ctest or of one of pytest's runs at all."""

import pathlib
import sys
import xml.etree.ElementTree as xml

E2E = pathlib.Path(__file__).resolve().parents[1] / "e2e"


def cases(path):
    """(name, failed) of every test case in the file that was not skipped."""
    for case in xml.parse(path).iter("testcase"):
        is_skipped = case.find("skipped") is not None or case.get("status") in ("notrun", "disabled")
        if not is_skipped:
            yield case.get("name"), case.find("failure") is not None or case.find("error") is not None


def main(folder):
    e2e_runs = [folder / "e2e" / f"{test.stem}.xml" for test in sorted(E2E.glob("*_test.py"))]
    whole_runs = [folder / "ctest.xml", *e2e_runs]
    missing = [path.name for path in whole_runs if not path.exists() or not any(cases(path))]
    programs = {path.stem: [failed for _, failed in cases(path)]
                for path in folder.glob("*.xml") if path not in whole_runs}
    outcomes = [failed for path in e2e_runs if path.name not in missing for _, failed in cases(path)]
    for name, failed in cases(folder / "ctest.xml") if "ctest.xml" not in missing else []:
        own = programs.get(name, [])
        outcomes += own
        # A program counts once itself when it has no cases, or when it failed outside of them.
        if not own or (failed and not any(own)):
            outcomes.append(failed)
    if missing:
        print(f"no results in {', '.join(missing)}")
    print(f"{outcomes.count(False)} passed, {outcomes.count(True)} failed")
    return 1 if missing or any(outcomes) or not outcomes else 0


if __name__ == "__main__":
    sys.exit(main(pathlib.Path(sys.argv[1])))
