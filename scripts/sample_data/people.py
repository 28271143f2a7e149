# SPDX-License-Identifier: Apache-2.0
"""Whom the owner was in touch with: an address book, an Android phone's backup, a Maildir."""

from datetime import datetime

from .common import LOCAL_OFFSET, utc

ANNA = "+436605551234"
TOM = "+436645550077"
OWNER = "ich@example.org"
JAKOB = "jakob.muster@example.org"

CARDS = """BEGIN:VCARD
VERSION:3.0
UID:anna-beispiel
FN:Anna Beispiel
N:Beispiel;Anna;;;
TEL;TYPE=CELL:+43 660 555 12 34
EMAIL;TYPE=HOME:anna@example.org
BDAY:1991-06-14
END:VCARD
BEGIN:VCARD
VERSION:4.0
UID:urn:uuid:4fbe8971-0bc3-424c-9c26-36c3e1eff6b1
FN:Jakob Muster
TEL;VALUE=uri;TYPE="voice,cell":tel:+43-676-555-98-76
EMAIL:jakob.muster@example.org
GEO:geo:47.0707,15.4395
END:VCARD
BEGIN:VCARD
VERSION:3.0
UID:tom-vorlage
FN:Tom Vorlage
TEL;TYPE=CELL:+43 664 555 00 77
ANNIVERSARY:2016-06-02
END:VCARD
BEGIN:VCARD
VERSION:2.1
N;CHARSET=UTF-8;ENCODING=QUOTED-PRINTABLE:Gr=C3=BCn;Gro=C3=9Fmutter
TEL;HOME:0316/55512
END:VCARD
"""

# With Anna: local time, 1 received or 2 sent.
ANNAS = [
    ("2024-05-24 18:02:11", 1), ("2024-05-24 18:05:40", 2), ("2024-05-31 09:12:00", 2),
    ("2024-05-31 09:30:27", 1), ("2024-06-05 20:14:02", 1), ("2024-06-05 20:15:33", 2),
    ("2024-06-09 12:40:18", 2), ("2024-06-09 12:58:51", 1), ("2024-06-12 21:03:09", 1),
    ("2024-06-12 21:10:44", 2), ("2024-06-14 07:58:30", 2), ("2024-06-14 08:20:05", 1),
    ("2024-06-15 07:31:00", 1), ("2024-06-15 07:33:26", 2), ("2024-06-15 19:47:12", 1),
    ("2024-06-15 19:52:39", 2),
]

# With Tom, who is close: local time, 1 received or 2 sent, what it says where that matters.
CAKE = "https://example.org/rezepte/erdbeerkuchen"
TOMS = [
    ("2024-05-20 19:12:00", 1, ""), ("2024-05-20 19:14:30", 2, ""),
    ("2024-05-21 12:05:10", 1, f"Machen wir den? {CAKE}"), ("2024-05-21 12:09:44", 2, ""),
    ("2024-05-21 16:50:00", 2, ""), ("2024-05-23 17:25:00", 2, ""),
    ("2024-05-23 17:26:20", 1, ""), ("2024-05-25 10:40:00", 1, ""),
    ("2024-05-25 10:41:15", 2, ""), ("2024-05-28 11:58:00", 1, ""),
    ("2024-05-28 12:01:37", 2, ""), ("2024-05-29 18:35:00", 2, ""),
    ("2024-05-29 18:36:02", 1, ""), ("2024-05-29 18:40:50", 1, ""),
    ("2024-05-31 10:15:00", 1, "Karte: https://www.example.com/maerchenpark/plan"),
    ("2024-05-31 10:31:20", 2, ""), ("2024-06-01 12:15:00", 2, ""),
    ("2024-06-01 12:20:45", 1, ""), ("2024-06-03 13:00:00", 1, ""),
    ("2024-06-03 13:04:00", 2, ""), ("2024-06-05 15:40:00", 1, ""),
    ("2024-06-05 15:41:30", 2, ""),
    ("2024-06-05 21:02:00", 1, "Fuer Freitag: https://example.org/hamburg/hafenmuseum?tag=fr"),
    ("2024-06-05 21:06:12", 2, ""), ("2024-06-10 21:30:00", 2, ""),
    ("2024-06-10 21:34:10", 1, ""), ("2024-06-11 16:58:00", 2, ""),
    ("2024-06-11 17:02:00", 1, ""), ("2024-06-13 16:10:00", 1, ""),
    ("2024-06-13 16:11:25", 2, ""), ("2024-06-16 12:05:00", 1, ""),
    ("2024-06-16 12:09:00", 2, ""),
]

# A link that Anna sent in her twelfth message, which the owner locked, and one in Jakob's tenth
# mail, which the owner flagged.
LINK_IN_TEXT = (12, "https://example.com/konzert?karten=2")
LINK_IN_MAIL = (10, "https://example.org/touren/rettenbachklamm", "Durch die Rettenbachklamm")

# With Anna and Tom: local time, seconds, 1 incoming, 2 outgoing or 3 missed.
ANNAS_CALLS = [("2024-05-26 18:20:00", 940, 1), ("2024-06-08 17:20:00", 611, 2),
               ("2024-06-14 18:40:10", 0, 3), ("2024-06-14 18:42:00", 184, 2)]
TOMS_CALLS = [("2024-05-22 16:20:00", 95, 2), ("2024-05-31 13:35:00", 140, 1),
              ("2024-06-10 19:15:00", 1260, 2)]

# local time, whether it is from the owner, subject
MAILS = [
    ("2024-05-28 19:10:00", False, "Huettenabend"),
    ("2024-05-28 21:02:00", True, "Re: Huettenabend"),
    ("2024-06-03 08:15:00", False, "Tourenbericht"),
    ("2024-06-03 12:20:00", True, "Re: Tourenbericht"),
    ("2024-06-07 07:45:00", False, "Wetter"),
    ("2024-06-07 08:02:00", True, "Re: Wetter"),
    ("2024-06-10 20:05:00", True, "Samstag"),
    ("2024-06-10 20:41:00", False, "Re: Samstag"),
    ("2024-06-13 22:00:00", True, "Treffpunkt"),
    ("2024-06-13 22:17:00", False, "Re: Treffpunkt"),
    ("2024-05-22 09:40:00", True, "Freitagabend"),
    ("2024-05-22 10:15:00", False, "Re: Freitagabend"),
]


def milliseconds(local):
    return int((utc(local) - LOCAL_OFFSET - datetime(1970, 1, 1)).total_seconds()) * 1000


def android_backup(root, entries):
    lines = ["<?xml version='1.0' encoding='UTF-8' standalone='yes' ?>",
             f'<{root} count="{len(entries)}">', *entries, f"</{root}>", ""]
    return "\n".join(lines)


def sms(number, name, local, kind, body, locked=False):
    return (f'  <sms protocol="0" address="{number}" date="{milliseconds(local)}" type="{kind}"'
            f' subject="null" body="{body}" read="1" status="-1"'
            + (' locked="1"' if locked else "") + f' contact_name="{name}" />')


def call(number, name, local, seconds, kind):
    return (f'  <call number="{number}" duration="{seconds}" date="{milliseconds(local)}"'
            f' type="{kind}" presentation="1" contact_name="{name}" />')


def make_messages(folder):
    folder.mkdir(parents=True, exist_ok=True)
    texts = []
    for number, (local, kind) in enumerate(ANNAS, start=1):
        is_link = number == LINK_IN_TEXT[0]
        body = f"Schau: {LINK_IN_TEXT[1]}" if is_link else f"Nachricht {number}"
        texts.append(sms(ANNA, "Anna Beispiel", local, kind, body, is_link))
    texts += [sms(TOM, "Tom Vorlage", local, kind, body or f"Zeile {number}")
              for number, (local, kind, body) in enumerate(TOMS, start=1)]
    texts.append(sms("Paketdienst", "(Unknown)", "2024-06-13 10:00:00", 1, "Ihr Paket"))
    (folder / "sms-20240616.xml").write_text(android_backup("smses", texts))
    calls = [call("0660 555 12 34", "Anna Beispiel", *made) for made in ANNAS_CALLS]
    calls += [call("0664 555 00 77", "Tom Vorlage", *made) for made in TOMS_CALLS]
    (folder / "calls-20240616.xml").write_text(android_backup("calls", calls))
    make_mails(folder / "Maildir")


def make_mails(folder):
    for name in ("cur", ".Sent/cur"):
        (folder / name).mkdir(parents=True, exist_ok=True)
    for number, (local, is_sent, subject) in enumerate(MAILS, start=1):
        sender, recipient = (OWNER, JAKOB) if is_sent else (JAKOB, OWNER)
        time = utc(local).strftime("%a, %d %b %Y %H:%M:%S +0200")
        place = ".Sent/cur" if is_sent else "cur"
        flags, kind, text = "S", "", f"Text {number}."
        if number == LINK_IN_MAIL[0]:
            flags, kind = "FS", "Content-Type: text/html; charset=utf-8\n"
            text = f'<p>Morgen: <a href="{LINK_IN_MAIL[1]}">{LINK_IN_MAIL[2]}</a></p>'
        (folder / place / f"{number}.sample:2,{flags}").write_text(
            f"From: {sender}\nTo: {recipient}\nDate: {time}\nMessage-ID: <{number}@example.org>\n"
            f"Subject: {subject}\n{kind}\n{text}\n")
    (folder / "cur" / "99.sample:2,").write_text(
        "From: Bergwetter <news@example.com>\nTo: ich@example.org\n"
        "Date: Fri, 14 Jun 2024 06:00:00 +0000\nMessage-ID: <news-24@example.com>\n"
        "List-Unsubscribe: <mailto:leave@example.com>\nSubject: Das Wochenende\n\nSonnig.\n")


def make_contacts(folder):
    folder.mkdir(parents=True, exist_ok=True)
    (folder / "freunde.vcf").write_text(CARDS.replace("\n", "\r\n"), newline="")
