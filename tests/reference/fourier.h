// SPDX-License-Identifier: Apache-2.0
// The truth of Fourier transforms: sums as they are defined, in double precision; and the packed layout, by a rule for
// each of its elements.
#pragma once
#include <cmath>
#include <complex>
#include <cstdint>
#include <vector>

#include "qori.h"

namespace qori::test::reference {

using Complex = std::complex<double>;

/// A complex image or spectrum, element (x, y) at y * width + x.
struct Field {
    int width, height;
    std::vector<Complex> values;

    Field(int w, int h) : width(w), height(h), values(static_cast<size_t>(w) * static_cast<size_t>(h)) {}
    Complex& at(int x, int y) {
        return values[static_cast<size_t>(y) * static_cast<size_t>(width) + static_cast<size_t>(x)];
    }
    const Complex& at(int x, int y) const {
        return values[static_cast<size_t>(y) * static_cast<size_t>(width) + static_cast<size_t>(x)];
    }
};

/// Sums of n numbers times e^(sign 2 pi i j k / n); of many by those of even and of odd index.
inline std::vector<Complex> transformed(const std::vector<Complex>& in, int sign) {
    const size_t n = in.size();
    std::vector<Complex> roots(n), out(n);
    if (n % 2 == 0 && n > 32) {
        std::vector<Complex> halves[2];
        for (size_t j = 0; j < n; ++j) halves[j % 2].push_back(in[j]);
        for (std::vector<Complex>& half : halves) half = transformed(half, sign);
        for (size_t k = 0; k < n / 2; ++k) {
            const double turn = sign * 2 * 3.14159265358979323846 * static_cast<double>(k) / static_cast<double>(n);
            const Complex odd = halves[1][k] * std::polar(1.0, turn);
            out[k] = halves[0][k] + odd;
            out[k + n / 2] = halves[0][k] - odd;
        }
        return out;
    }
    for (size_t k = 0; k < n; ++k)
        roots[k] = std::polar(1.0, sign * 2 * 3.14159265358979323846 * static_cast<double>(k) / static_cast<double>(n));
    for (size_t k = 0; k < n; ++k) {
        double re = 0, im = 0;  // without the operator's care for infinities, which costs most of the time
        for (size_t j = 0, turn = 0; j < n; ++j, turn = turn + k < n ? turn + k : turn + k - n) {
            re += in[j].real() * roots[turn].real() - in[j].imag() * roots[turn].imag();
            im += in[j].real() * roots[turn].imag() + in[j].imag() * roots[turn].real();
        }
        out[k] = {re, im};
    }
    return out;
}

/// sign -1: forward.
inline Field transformed(const Field& in, int sign) {
    Field out = in;
    for (int y = 0; y < in.height; ++y) {
        std::vector<Complex> row;
        for (int x = 0; x < in.width; ++x) row.push_back(in.at(x, y));
        row = transformed(row, sign);
        for (int x = 0; x < in.width; ++x) out.at(x, y) = row[static_cast<size_t>(x)];
    }
    for (int x = 0; x < in.width; ++x) {
        std::vector<Complex> column;
        for (int y = 0; y < in.height; ++y) column.push_back(out.at(x, y));
        column = transformed(column, sign);
        for (int y = 0; y < in.height; ++y) out.at(x, y) = column[static_cast<size_t>(y)];
    }
    return out;
}

/// Which number element (column, row) of a packed spectrum is: a part of a frequency.
struct PackedElement {
    int x, y;
    bool isImaginary;

    PackedElement(int column, int row, int width, int height) {
        // Of a side: how a spectrum of real numbers lies along it.
        const auto along = [](int i, bool& imaginary) {
            imaginary = i > 0 && i % 2 == 0;
            return (i + 1) / 2;
        };
        const bool isLast = width % 2 == 0 && column == width - 1;
        if (column == 0 || isLast) {
            x = isLast ? width / 2 : 0;
            y = along(row, isImaginary);
        } else {
            x = along(column, isImaginary);
            y = row;
        }
        (void)height;
    }
    /// Frequencies that are their own conjugates have no imaginary part; all others have two elements.
    bool isReal(int width, int height) const { return 2 * x % width == 0 && 2 * y % height == 0; }
};

inline double packedValue(const Field& spectrum, int column, int row) {
    const PackedElement e(column, row, spectrum.width, spectrum.height);
    const Complex value = spectrum.at(e.x, e.y);
    return e.isImaginary ? value.imag() : value.real();
}

/// The whole spectrum that packed values stand for: get(column, row).
template <class Get>
Field unpacked(int width, int height, Get get) {
    Field out(width, height);
    for (int row = 0; row < height; ++row)
        for (int column = 0; column < width; ++column) {
            const PackedElement e(column, row, width, height);
            const double value = get(column, row);
            const int mirrorX = (width - e.x) % width, mirrorY = (height - e.y) % height;
            const bool isOwnMirror = mirrorX == e.x && mirrorY == e.y;
            if (e.isImaginary) {
                out.at(e.x, e.y).imag(value);
                if (!isOwnMirror) out.at(mirrorX, mirrorY).imag(-value);
            } else {
                out.at(e.x, e.y).real(value);
                out.at(mirrorX, mirrorY).real(value);
            }
        }
    return out;
}

}  // namespace qori::test::reference
