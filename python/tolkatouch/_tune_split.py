"""The corpus split of tolkatouch.tune: a tuning part the search sees and a held-out part it never
sees, by recording, stratified by the kinds of gesture each recording is labelled with.

A recording's stratum is the set of label kinds in it ("tap", "brush+tap", "" for a noise-only
recording). Within a stratum the recordings are ordered by a hash of their file name, so the split
depends neither on where the corpus lies nor on the order it was listed in, and each stratum gives
round(fraction x its size) recordings to the held-out part, at least one and never all of a
stratum of two or more. The tuning part is ordered so that every leading share of it is itself
spread over the strata: the pruner's growing shares each see every kind of recording.
"""

from __future__ import annotations

import hashlib
import json
import os
from dataclasses import dataclass
from typing import Dict, List, Sequence


@dataclass(frozen=True)
class Split:
    tuning: tuple  # paths, in the order the growing shares take them
    heldout: tuple  # paths, in corpus order


def labels_path(document: str) -> str:
    """DOC.labels.json beside DOC.json, as eval looks for it."""
    stem = document[:-5] if document.endswith(".json") else document
    return stem + ".labels.json"


def stratum(document: str) -> str:
    """The kinds of gesture the document's labels name, sorted and joined by '+'; OSError or
    ValueError when its labels cannot be read."""
    with open(labels_path(document), "rb") as labels_file:
        labels = json.load(labels_file).get("Labels", [])
    return "+".join(sorted({str(label.get("Kind", "")) for label in labels}))


def _order_key(document: str) -> str:
    return hashlib.sha256(os.path.basename(document).encode()).hexdigest()


def split_corpus(documents: Sequence[str], strata: Sequence[str], heldout_fraction: float) -> Split:
    """Splits documents (with their strata, one each) into a tuning part and a held-out part."""
    groups: Dict[str, List[str]] = {}
    for document, name in zip(documents, strata):
        groups.setdefault(name, []).append(document)
    heldout = set()
    tuning_groups = []
    for name in sorted(groups):
        members = sorted(groups[name], key=_order_key)
        count = round(heldout_fraction * len(members))
        if len(members) >= 2 and heldout_fraction > 0.0:
            count = min(max(count, 1), len(members) - 1)
        heldout.update(members[:count])
        tuning_groups.append(members[count:])
    # Interleaved by rank within the stratum: the first k of the tuning part hold every stratum in
    # about its share.
    ranked = []
    for members in tuning_groups:
        for rank, document in enumerate(members):
            ranked.append(((rank + 0.5) / len(members), _order_key(document), document))
    tuning = tuple(document for _, _, document in sorted(ranked))
    return Split(tuning=tuning, heldout=tuple(d for d in documents if d in heldout))
