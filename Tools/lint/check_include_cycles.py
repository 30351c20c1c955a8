#!/usr/bin/env python3
"""Checks that no header of the project includes itself, directly or through others."""

import pathlib

import project


def first_cycle_from(start, graph, done):
    """Walks the headers below `start`; answers the first way round that it finds, or None. `done` holds headers without one."""
    way = [start]
    left = [iter(graph.get(start, ()))]
    while way:
        for header in left[-1]:
            if header in way:
                return way[way.index(header):] + [header]
            if header not in done:
                way.append(header)
                left.append(iter(graph.get(header, ())))
                break
        else:
            done.add(way.pop())
            left.pop()
    return None


def main():
    options = project.arguments(__doc__)
    names = project.cxx_files(options.root)
    graph = {name: [pathlib.Path(header) for _, header, quoted in project.includes(options.root, name) if quoted]
             for name in names}
    done = set()
    problems = []
    for name in names:
        cycle = first_cycle_from(name, graph, done) if name not in done else None
        if cycle:
            problems.append("cycle: " + " -> ".join(map(str, cycle)))
            done.update(cycle)
    project.finish(problems, f"{len(names)} files without a cycle")


if __name__ == "__main__":
    main()
