"""Runs a plan of `vexg plan` on workers of Dask: `python3 -m vexg.dask DIR`.

Documents are named to the workers, which run `vexg run --once` on them in a folder that all of them
see; no pixel travels by Dask. What is done lies on the disk, so that a worker that dies costs its
document, and a second run does nothing.

    python3 -m vexg.dask plan --workers 4
    python3 -m vexg.dask plan --scheduler tcp://head:8786

Workers of a cluster that are to be given no more documents than their memory holds say how much that
is: `dask worker tcp://head:8786 --nthreads 4 --resources "memory=16e9"`.
"""

import argparse
import json
import logging
import os
import pathlib
import sys


def run_document(vexg, folder, document, threads, *before):
    """Runs one document of a plan, on a worker.

    Args:
        vexg: the program.
        folder: that of the plan.
        document: its name there.
        threads: how many the program uses.
        before: what the documents gave that come first, which are done by now.

    Returns:
        What the program said: nothing when all is well.
    """
    import os
    import subprocess

    for said in before:
        if said:
            return f"{document}: left out, as what comes first failed"
    ended = subprocess.run(
        [vexg, "run", "--once", "-q", document], cwd=folder, stdin=subprocess.DEVNULL, capture_output=True,
        text=True, check=False, env={**os.environ, "LUMO_THREADS_HINT": str(threads)})
    if ended.returncode == 0:
        return ""
    if ended.returncode < 0:  # a signal has ended it; another attempt may do better
        raise RuntimeError(f"{document}: ended by signal {-ended.returncode}")
    return ended.stderr.strip() or f"{document}: ended with code {ended.returncode}"


def submit(client, folder, vexg="vexg", retries=20):
    """Hands the documents of a plan to the workers of a client, each behind those that it needs.

    Args:
        client: of dask.distributed.
        folder: of the plan.
        vexg: the program, as workers find it.
        retries: how often a document is tried again whose program a signal ended.

    Returns:
        A dictionary of futures by the names of the documents. Each gives what the program said,
        nothing when all is well.
    """
    folder = os.path.abspath(folder)
    documents = json.loads((pathlib.Path(folder) / "manifest.json").read_text())["documents"]
    workers = client.scheduler_info()["workers"].values()
    counts_memory = bool(workers) and all("memory" in worker.get("resources", {}) for worker in workers)
    futures = {}
    for document in documents:
        name = document["document"]
        # Where workers don't say how much they have, asking for it would wait for ever.
        needs = {"resources": {"memory": document["memory"]}} if counts_memory else {}
        futures[name] = client.submit(
            run_document, vexg, folder, name, document["threads"],
            *(futures[other] for other in document["dependsOn"]),
            key=f"vexg-{document['hash']}-{name}", retries=retries, pure=False, **needs)
    return futures


def local_cluster(workers, threads):
    """Makes workers on this machine, which share its memory evenly."""
    import dask
    from dask.distributed import LocalCluster

    # A worker that dies takes one document with it, which isn't to blame.
    dask.config.set({"distributed.scheduler.allowed-failures": 1000})
    memory = os.sysconf("SC_PAGE_SIZE") * os.sysconf("SC_PHYS_PAGES")
    return LocalCluster(n_workers=workers, threads_per_worker=1, processes=True, dashboard_address=None,
                        resources={"memory": memory / workers}, memory_limit=None,
                        silence_logs=logging.CRITICAL,  # of workers that come and go; faults are said here
                        extensions={})  # which the packages of some distributions lack


def main(arguments=None):
    """Runs a plan, and gives the exit code."""
    parser = argparse.ArgumentParser(prog="python3 -m vexg.dask", description=__doc__.split("\n")[0])
    parser.add_argument("folder", metavar="DIR", help="the folder of the plan")
    parser.add_argument("--scheduler", metavar="ADDRESS", help="of a cluster; by default workers of this machine")
    parser.add_argument("--workers", metavar="N", type=int, help="how many, on this machine")
    parser.add_argument("--vexg", default="vexg", help="the program, as workers find it")
    options = parser.parse_args(arguments)
    try:
        from dask.distributed import Client
    except ImportError:
        print("vexg.dask: python3-distributed is not installed", file=sys.stderr)
        return 1
    try:
        documents = json.loads((pathlib.Path(options.folder) / "manifest.json").read_text())["documents"]
    except (OSError, ValueError, KeyError):
        print(f"vexg.dask: {options.folder}: there is no plan here; vexg plan makes one", file=sys.stderr)
        return 2
    threads = max(document["threads"] for document in documents)
    workers = options.workers or max(1, (os.cpu_count() or 1) // threads)
    cluster = None if options.scheduler else local_cluster(workers, threads)
    failed = 0
    try:
        with Client(options.scheduler or cluster) as client:
            for name, future in submit(client, options.folder, options.vexg).items():
                try:
                    said = future.result()
                except Exception as error:  # of the workers
                    said = f"{name}: {error}"
                if said:
                    failed += 1
                    print(said, file=sys.stderr)
    finally:
        if cluster is not None:
            cluster.close()
    return 1 if failed else 0


if __name__ == "__main__":
    sys.exit(main())
