#!/usr/bin/env python3
"""make_fleet_results.py DIR MACHINES APPS ROUND

Writes the results of MACHINES machines, APPS applications each, as trllocator collect writes
them (DIR/hostNNNNNN.xml.gz): the search options of the folders searched and the filtered
matches, each application identified with all of its 20 files found. The applications of a
machine are drawn from a pool of 20 x APPS, in versions 1 to 5. ROUND 0 is a first inventory;
ROUND 1 is the same fleet a while later: on each machine 5% of the applications upgraded, 2% gone
and 1% new. The same arguments always give the same files.
"""
import gzip
import os
import random
import sys

FILES = 20


def application(app, version):
    name = f"{version // 10 + 1}.{version % 10}.0"
    files = "".join(
        f'<f f_id="{k}" f_name="lib{app}_{k}.so" f_weight="1" f_exists="1" p_max="3" p_act="3"/>'
        for k in range(1, FILES + 1))
    return (f'<a a_id="{app}" a_name="app{app}" a_max_seq="9" a_manage="1" v_id="{version}" '
            f'v_name="{name}" v_seq="{version}"><v v_id="{version}" v_name="{name}" '
            f'v_seq="{version}" v_max="{FILES}" f_max="{FILES}" f_act="{FILES}" v_act="{FILES}" '
            f'v_weight="1">{files}</v></a>')


def machine(number, apps, pool, round_):
    rng = random.Random(number)
    found = {app: rng.randint(1, 5) for app in rng.sample(range(1, pool + 1), apps)}
    if round_ == 1:
        for app in list(found):
            roll = rng.random()
            if roll < 0.05:
                found[app] += 1
            elif roll < 0.07:
                del found[app]
        for app in rng.sample(range(pool + 1, pool + 1 + apps), max(1, apps // 100)):
            found[app] = 1
    name = f"host{number:06d}"
    computer = f'c_text="{name}" c_name="{name}" c_local="1"'
    folders = "".join(
        f'<d d_id="{i}" d_text="\\opt\\app{app}\\" d_name="\\opt\\app{app}\\">'
        f'{application(app, version)}</d>'
        for i, (app, version) in enumerate(sorted(found.items()), start=1))
    return (f'<trl_machine c_text="{name}" c_name="{name}"><trl_searchoptions>'
            f'<c c_id="1" {computer}><m m_id="1" m_text="" m_name="">'
            f'<d d_id="1" d_text="\\usr\\" d_search="1" d_search_recurse="True"><d_search_mask/></d>'
            f'<d d_id="2" d_text="\\opt\\" d_search="1" d_search_recurse="True"><d_search_mask/></d>'
            f'</m></c></trl_searchoptions><trl_applicationdata search_start="2025-01-01 00:00:00" '
            f'search_end="2025-01-01 00:00:10" compare_start="2025-01-01 00:00:10" '
            f'compare_end="2025-01-01 00:00:20"><c c_id="1" {computer}>'
            f'<m m_id="1" m_text="" m_name="">{folders}</m></c></trl_applicationdata>'
            f'</trl_machine>\n')


def main():
    folder, machines, apps, round_ = sys.argv[1], int(sys.argv[2]), int(sys.argv[3]), int(sys.argv[4])
    os.makedirs(folder, exist_ok=True)
    for number in range(machines):
        path = os.path.join(folder, f"host{number:06d}.xml.gz")
        with open(path, "wb") as raw, gzip.GzipFile(fileobj=raw, mode="wb", mtime=0) as out:
            out.write(machine(number, apps, 20 * apps, round_).encode("utf-8"))


if __name__ == "__main__":
    main()
