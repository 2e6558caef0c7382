"""The texts of the sample books. Written for them; anybody may use them for anything."""

LAMPLIGHTER = {
    "title": "The Lamplighter of Vey",
    "author": "Ines Calloway",
    "identifier": "urn:uuid:5b0c2f0e-7f5d-4f0b-9d3a-6f1f5a2d7c11",
    "subject": "Short Stories",
    "description": "In a town that sells its evenings, one lamp is lit for nobody in particular.",
    "chapters": [
        ("The Hour Before", """
The town of Vey lies so far down in its valley that evening comes there at three in the afternoon.
For this reason it has always had more lamps than people, and one person more than it needs, whose
work it is to light them.

In the year of the long rain that person was Odile Marr. She carried a ladder she had not made and
a pole she had, and she knew the lamps by their faults: the one that sulked, the one that sang, the
one on Tanner's Stair that would not burn unless it was told what day it was.

“Wednesday,” she would say, and up it went.
"""),
        ("The Lamp on the Bridge", """
There was a lamp on the bridge that stood in no book. The town paid for two hundred and twelve;
Odile lit two hundred and thirteen. She had counted them the first week, and the second week, and
after that she had stopped counting and begun to be proud.

“Who is it for?” the clerk asked her, when the oil would not come out even.

“It is for whoever is late,” said Odile.

The clerk considered this. He was a careful man, and he looked down the whole column of his figures
for the place where it might go. In the end he wrote it in the margin, where the paper was still
white, and drew a small line around it so that nobody would add it up.
"""),
        ("Morning", """
She died in a dry spring, at a great age, in the afternoon, which in Vey is the evening. That night
nobody thought of the lamps until it was too dark to find the ladder.

But the one on the bridge was burning. The clerk had lit it. He was standing under it with oil on
his cuffs, telling it, somewhat shyly, what day it was.
"""),
    ],
}

SALT = {
    "title": "Salt and Starlight",
    "author": "Tobias Wren",
    "identifier": "urn:uuid:0d9a3c58-1f6e-4a55-8a57-3c1d9e84b6f2",
    "subject": "Poetry",
    "description": "Four short poems from a harbour wall.",
    "verse": True,
    "chapters": [
        ("Harbour", """
The boats come in on what is left
of light, and tie themselves to names.
Somebody counts them. Somebody
leaves one more lamp than there are boats.
"""),
        ("Soundings", """
Let down the lead, and read the sea
by what comes up upon the wax:
grey sand, a shell, the green of weed,
and once, a star, that washed right off.

Mark that one, said the mate. I did.
It is the only depth I trust.
"""),
        ("Low Water", """
What the tide writes it also reads,
and rubs out gently, line by line.
I walked along its margin once
and found a word I thought was mine.
"""),
        ("Leaving", """
Salt on the rail, salt on the sleeve,
salt in the bread and in the rope;
and overhead, in no one's pay,
the whole sky working through the night.
"""),
    ],
}

CLOUDS = {
    "title": "A Field Guide to Clouds",
    "author": "Marguerite Oake",
    "identifier": "urn:uuid:c7f1b2a4-92d5-4d0e-b0a8-5e7a6f3c9d20",
    "subject": "Nature",
    "description": "How to tell what is passing over you, and what to do about it (nothing).",
    "chapters": [
        ("Before You Begin", """
You will need a sky. A small one will do: the piece above a courtyard, or between two chimneys.
Lie down if you can. Clouds have been looked at for so long by people standing up that they have
grown used to it, and do nothing.
"""),
        ("Heaps", """
The heaped cloud is the one that children draw, and they are right about it. It has a flat floor,
because that is the height at which the air gives up its water, and a top that is still being
decided. Watch one edge of it and count to sixty. You will have seen more building work than in a
month of any town.
"""),
        ("Sheets and Feathers", """
The sheet is only a heap with no ambition. It is at its best at dusk, when it lets itself be
coloured by anybody.

The feathers are ice, seven miles up, and falling. They never arrive. If you find one pointing at
you, it is the wind's doing and no compliment; but you may take it as one.
"""),
    ],
}

GARDEN = {
    "title": "The Clockmaker’s Garden",
    "author": "Ruben Hale",
    "identifier": "clockmakers-garden-0001",
    "store_id": "480215637",
    "subject": "Fiction",
    "description": "A clockmaker plants the hours, and some of them come up.",
    "chapters": [
        ("Seed", """
When his eyes were too old for clocks, Anselm Pell put the wheels away in their trays and went out
into the garden to be idle, and found that he did not know how.

So he planted a dial. Twelve beds in a ring, and in each a flower that opens at its own hour: bindweed
for five, water lily for seven, and for the deep of the night the pale tobacco that his wife had
liked.
"""),
        ("Bloom", """
The first summer it ran eleven minutes fast. He spoke to the marigolds.

The second summer it kept time so well that the schoolmaster came to set the school by it, leaning
over the wall with his watch in his hand. “Four o'clock is late,” he called. “Four o'clock,” said
Anselm, “is enjoying itself.”
"""),
        ("Fruit", """
In the third summer a bed that he had left empty, between ten and eleven, put up a stem. He had
sown nothing there. It opened once, towards evening, at no hour that had a name, and stayed open for
as long as he stood and looked at it.

He did not ask what it was. He brought out a chair.
"""),
    ],
}
