#include "image/trigonometry.h"

#include <array>
#include <cmath>
#include <limits>

#include "image/number_pair.h"

// The angle is brought within an eighth of a circle of 0 by quarters, whose size is known to 160 bits, so
// that what is left of an angle close to a whole number of them has its bits too. There sine and cosine are
// their series.

namespace zor {
namespace {

/// The terms of a series in the square of x, beginning with 1 / first!, with signs that change.
template <std::size_t Count>
constexpr auto Alternating(std::size_t first) {
  std::array<NumberPair, Count> terms{};
  for (std::size_t k = 0; k < Count; ++k) {
    const NumberPair term = FactorialInverses[first + 2 * k];
    terms[k] = k % 2 ? NumberPair{-term.High, -term.Low} : term;
  }
  return terms;
}
constexpr auto SineTerms = Alternating<12>(1);
constexpr auto CosineTerms = Alternating<13>(0);

/// An angle as whole quarters of the circle, 0 to 3, and at most an eighth to either side.
struct Angle {
  static constexpr NumberPair Quarter{0x1.921fb54442d18p+0, 0x1.1a62633145c07p-54};
  static constexpr double QuarterRest = -0x1.f1976b7ed8fbcp-110;

  int Quarters;
  NumberPair Rest;

  explicit Angle(double x) {
    const double count = std::floor(x / Quarter.High + 0.5);
    Quarters = int(count - 4 * std::floor(count / 4));
    Rest = NumberPair{x} + Product(-count, Quarter.High);
    Rest = Rest + Product(-count, Quarter.Low);
    Rest = Rest + Product(-count, QuarterRest);
  }
  NumberPair SineOf() const { return Turned(Quarters); }
  NumberPair CosineOf() const { return Turned((Quarters + 1) % 4); }

 private:
  /// The sine of Rest and so many quarters.
  NumberPair Turned(int quarters) const {
    const NumberPair square = Rest * Rest;
    const NumberPair value =
        quarters % 2 ? Series<5>(CosineTerms, square) : Rest * Series<5>(SineTerms, square);
    return quarters < 2 ? value : NumberPair{-value.High, -value.Low};
  }
};

constexpr unsigned Points = 128;

/// The sines of the points.
constexpr auto PointSines = [] {
  std::array<NumberPair, Points> sines{};
  for (unsigned i = 0; i <= Points / 4; ++i) {
    const NumberPair angle = Angle::Quarter * NumberPair{i / (Points / 4.0)};
    const NumberPair sine = angle * Series<12>(SineTerms, angle * angle);
    sines[i] = sines[Points / 2 - i] = sine;
    sines[(Points - i) % Points] = sines[Points / 2 + i] = {-sine.High, -sine.Low};
  }
  return sines;
}();

/// Gives the sine of x and so many quarters, if it is sure of it.
bool FromPoints(double x, unsigned quarters, double& sine) {
  // The first part of a step has 32 bits, a count 21 at most, so that product and difference are exact.
  constexpr double stepsPerUnit = 0x1.45f306dc9c883p+4, step = 0x1.921fb54400000p-5,
                   stepRest = 0x1.0b4611a626331p-39;
  const double count = std::floor(x * stepsPerUnit + 0.5);
  const unsigned point = unsigned(int(count)) + quarters * (Points / 4);
  const NumberPair s = PointSines[point % Points];
  const NumberPair c = PointSines[(point + Points / 4) % Points];
  const double more = count * stepRest;
  const NumberPair rest = Sum(x - count * step, -more);
  const double r = rest.High, square = r * r;
  const double sineLess = r * square * (-1.0 / 6 + square * (1.0 / 120 - square * (1.0 / 5040)));
  const double cosineLess =
      square * (-0.5 + square * (1.0 / 24 - square * (1.0 / 720 - square * (1.0 / 40320))));
  const double turn = c.High * r;
  const NumberPair value =
      Sum(s.High, turn + (s.High * cosineLess + c.High * sineLess + (s.Low + c.High * rest.Low + c.Low * r)));
  // The roundings of the turn and of its sum, those of what is added to it, and that of what a step lacks.
  const double error =
      std::fabs(turn) * 0x1.2p-52 + std::fabs(value.High) * 0x1p-60 + std::fabs(more) * 0x1.2p-52;
  sine = value.High + (value.Low + error);
  return sine == value.High + (value.Low - error);
}

constexpr double NotANumber = std::numeric_limits<double>::quiet_NaN();
bool InReach(double x) { return std::fabs(x) <= 1e5; }

}

double Sine(double x) {
  // Zero keeps its sign.
  if (x == 0) return x;
  if (!InReach(x)) return NotANumber;
  double sine;
  return FromPoints(x, 0, sine) ? sine : Angle(x).SineOf().High;
}

double Cosine(double x) {
  if (!InReach(x)) return NotANumber;
  double cosine;
  return FromPoints(x, 1, cosine) ? cosine : Angle(x).CosineOf().High;
}

double Tangent(double x) {
  if (x == 0) return x;
  if (!InReach(x)) return NotANumber;
  const Angle angle(x);
  return (angle.SineOf() / angle.CosineOf()).High;
}

}
