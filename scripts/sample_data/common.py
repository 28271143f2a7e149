# SPDX-License-Identifier: Apache-2.0
"""Times and places that the subjects share."""

from datetime import datetime, timedelta

LOCAL_OFFSET = timedelta(hours=2)  # Europe/Vienna, the whole month

HOME = (47.0790, 15.4500)
OFFICE = (47.0585, 15.4590)
MARKET = (47.0672, 15.4423)
GYM = (47.0931, 15.4188)
TAVERN = (47.0866, 15.4702)
POOL = (47.0440, 15.4015)
CASTLE = (46.9712, 15.5530)
PARK = (46.8885, 15.8610)
THEATRE = (47.0741, 15.4429)
VINEYARD = (46.8290, 15.5710)
FROHNLEITEN = (47.2705, 15.3260)
SUMMIT = (47.2040, 15.4660)
INN = (47.2065, 15.4672)
HALL = (47.0708, 15.4446)
LAKE = (46.6247, 14.1530)  # farther from home than the surroundings reach
CINEMA = (47.0655, 15.4510)
# In Hamburg and Vienna.
ELBE_HOTEL = (53.5461, 9.9660)
FISH_HOUSE = (53.5583, 9.9610)
HARBOUR_MUSEUM = (53.5330, 10.0005)
BEACH = (53.5448, 9.8955)
DANUBE_HOTEL = (48.2212, 16.3955)
FAIR = (48.2180, 16.4090)


def utc(text):
    """What stands in `text`, without a zone."""
    return datetime.fromisoformat(text)


def local(text):
    """The UTC time at which the owner's clocks show `text`."""
    return utc(text) - LOCAL_OFFSET


def iso(time):
    return time.strftime("%Y-%m-%dT%H:%M:%SZ")
