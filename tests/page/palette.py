"""Whether the five hues are told apart by people who see few colors: their distance as three sorts of color blindness see
them, computed. The matrices are those of Machado, Oliveira and Fernandes (2009) for full deficiency."""
import itertools
import math

SIGHTS = {
    "full": ((1, 0, 0), (0, 1, 0), (0, 0, 1)),
    "without red": ((0.152286, 1.052583, -0.204868), (0.114503, 0.786281, 0.099216), (-0.003882, -0.048116, 1.051998)),
    "without green": ((0.367322, 0.860646, -0.227968), (0.280085, 0.672501, 0.047413), (-0.011820, 0.042940, 0.968881)),
    "without blue": ((1.255528, -0.076749, -0.178779), (-0.078411, 0.930809, 0.147602), (0.004733, 0.691367, 0.303900)),
}
# A just noticeable difference is about 2.3; cells are small, so much more is asked for.
LEAST = {"strong": 20, "pale": 10}


def linear(color):
    values = [int(color[at:at + 2], 16) / 255 for at in (1, 3, 5)]
    return [value / 12.92 if value <= 0.04045 else ((value + 0.055) / 1.055) ** 2.4 for value in values]


def lab(rgb):
    red, green, blue = rgb
    x = 0.4124 * red + 0.3576 * green + 0.1805 * blue
    y = 0.2126 * red + 0.7152 * green + 0.0722 * blue
    z = 0.0193 * red + 0.1192 * green + 0.9505 * blue
    root = [value ** (1 / 3) if value > 0.008856 else 7.787 * value + 16 / 116 for value in (x / 0.9505, y, z / 1.089)]
    return (116 * root[1] - 16, 500 * (root[0] - root[1]), 200 * (root[1] - root[2]))


def seen(color, sight):
    rgb = linear(color)
    return lab([min(1, max(0, sum(weight * value for weight, value in zip(row, rgb)))) for row in SIGHTS[sight]])


def closest(colors):
    """(distance, sight, name, name) of the two that are told apart worst."""
    return min((math.dist(seen(one, sight), seen(other, sight)), sight, name, another)
               for sight in SIGHTS for (name, one), (another, other) in itertools.combinations(colors.items(), 2))
