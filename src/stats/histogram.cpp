// SPDX-License-Identifier: Apache-2.0
// Histograms with levels given in the call or prepared in a record.
#include <cfloat>

#include "frame/checks.h"
#include "frame/float_control.h"
#include "frame/plan.h"
#include "histogram_count.h"

namespace qori::stats {
namespace {

/// Whether an array of n pointers or one of its entries is null.
template <class P>
bool anyNull(P* pointers, int n) {
    if (pointers == nullptr) return true;
    for (int c = 0; c < n; ++c)
        if (pointers[c] == nullptr) return true;
    return false;
}

QorResult levelCountCheck(const int32_t* counts, int n) {
    for (int c = 0; c < n; ++c)
        if (counts[c] < 2) return QOR_ERR_HIST_LEVELS;
    return QOR_OK;
}

/// Floats are compared with levels: subnormals count as what they are, and NaN traps nowhere.
template <class T, Layout layout>
QorResult countUnderControl(QorImageSize roi, Image<const T> src, const Channel<Level<T>>* out) {
    const auto count = [=] {
        countDirectly<T, layout>(roi, src, out);
        return QOR_OK;
    };
    return underControlOf<T>(count);
}

// --- levels with the call -------------------------------------------------------------------------------------------

template <class T, class L>
QorResult directChecks(Image<const T> src, QorImageSize roi, int n, int32_t* const* pHist, L* const* pLevels,
                       const int32_t* nLevels) {
    if (isNull(src) || anyNull(pHist, n) || anyNull(pLevels, n) || nLevels == nullptr) return QOR_ERR_NULL_PTR;
    return firstOf(sizeCheck(roi), stepCheck(src), levelCountCheck(nLevels, n));
}

template <class T, Layout layout>
QorResult histogramRange(Image<const T> src, QorImageSize roi, int32_t* const* pHist, const Level<T>* const* pLevels,
                         const int32_t* nLevels) {
    constexpr int n = processedChannels(layout);
    if (QorResult r = directChecks(src, roi, n, pHist, pLevels, nLevels)) return r;
    Channel<Level<T>> out[n];
    for (int c = 0; c < n; ++c) out[c] = {pLevels[c], nLevels[c], pHist[c]};
    return countUnderControl<T, layout>(roi, src, out);
}

/// The remainder of the division widens the first bins by one each, in the direction of the levels.
void spaceEvenly(int32_t lower, int32_t upper, int32_t count, int32_t* levels) {
    const int64_t span = int64_t{upper} - lower, width = span / (count - 1), remainder = span % (count - 1);
    const int64_t sign = span < 0 ? -1 : 1;
    int64_t level = lower;
    for (int32_t k = 0; k < count; ++k) {
        levels[k] = static_cast<int32_t>(level);
        level += width + (k < sign * remainder ? sign : 0);
    }
}

template <class T, Layout layout>
QorResult histogramEven(Image<const T> src, QorImageSize roi, int32_t* const* pHist, int32_t* const* pLevels,
                        const int32_t* nLevels, const int32_t* lowerLevel, const int32_t* upperLevel) {
    constexpr int n = processedChannels(layout);
    if (lowerLevel == nullptr || upperLevel == nullptr) return QOR_ERR_NULL_PTR;
    if (QorResult r = directChecks(src, roi, n, pHist, pLevels, nLevels)) return r;
    Channel<int32_t> out[n];
    for (int c = 0; c < n; ++c) {
        spaceEvenly(lowerLevel[c], upperLevel[c], nLevels[c], pLevels[c]);
        out[c] = {pLevels[c], nLevels[c], pHist[c]};
    }
    return countUnderControl<T, layout>(roi, src, out);
}

// --- levels in a record ---------------------------------------------------------------------------------------------

/// The record: 12 words, then the level arrays of the channels one after another.
struct Record {
    static constexpr uint32_t kIdentifier = 0x74736968;  // "hist" in memory

    int32_t dataType;
    int32_t channels;
    int32_t uniform;
    uint32_t identifier;
    int32_t counts[4];
    /// Where the arrays lie: addresses where 32 bits hold them, else offsets from the record.
    uint32_t places[4];

    /// Bytes from the record's beginning to a channel's levels; those of the channel behind the last measure it.
    static int64_t offset(const int32_t* counts, int channel) {
        BlockLayout layout(4);
        layout.add(sizeof(Record));
        for (int c = 0; c < channel; ++c) layout.add(int64_t{counts[c]} * 4);
        return layout.bytes();
    }
    template <class L>
    L* levels(int channel) {
        return tableOf<L>(this, offset(counts, channel));
    }
    template <class L>
    const L* levels(int channel) const {
        return tableOf<L>(this, offset(counts, channel));
    }
    uint32_t place(int channel) const {
        if constexpr (sizeof(void*) == 4)
            return static_cast<uint32_t>(reinterpret_cast<uintptr_t>(levels<uint8_t>(channel)));
        else
            return static_cast<uint32_t>(offset(counts, channel));
    }
    void begin(int32_t type, int32_t n, int32_t isUniform, const int32_t* nLevels) {
        *this = {type, n, isUniform, kIdentifier, {}, {}};
        for (int c = 0; c < n; ++c) counts[c] = nLevels[c];
        for (int c = 0; c < n; ++c) places[c] = place(c);
    }
};
static_assert(sizeof(Record) == 48);

Record* recordOf(QorHistogramSpec* pSpec) { return reinterpret_cast<Record*>(pSpec); }
const Record* recordOf(const QorHistogramSpec* pSpec) { return reinterpret_cast<const Record*>(pSpec); }

bool strictlyIncreasing(const float* levels, int32_t count) {
    for (int32_t k = 1; k < count; ++k)
        if (!(levels[k - 1] < levels[k])) return false;
    return true;
}

QorResult typeCheck(int32_t type) { return dataTypeCheck(type, qor8u, qor16u, qor16s, qor32f); }

/// Truncation towards zero; what 32 bits do not hold, infinity included, becomes the nearest end of their range.
int32_t truncated(double value) {
    if (!(value > INT32_MIN)) return INT32_MIN;  // NaN too, between infinite levels
    return value < INT32_MAX ? static_cast<int32_t>(value) : INT32_MAX;
}

QorResult histogramSizes(int32_t dataType, QorImageSize roi, const int32_t* nLevels, int32_t numChannels, int32_t,
                         int32_t* pSpecSize, int32_t* pBufferSize) {
    if (QorResult r = firstOf(nullCheck(nLevels, pSpecSize, pBufferSize), sizeCheck(roi), channelsCheck(numChannels)))
        return r;
    if (QorResult r = levelCountCheck(nLevels, numChannels)) return r;
    if (QorResult r = reportSize(Record::offset(nLevels, numChannels), pSpecSize)) return r;
    const int32_t values = dataType == qor8u                          ? kValues<uint8_t>
                           : dataType == qor16u || dataType == qor16s ? kValues<uint16_t>
                                                                      : 0;
    *pBufferSize = 4 * values * numChannels;
    return typeCheck(dataType);
}

QorResult histogramInit(int32_t dataType, const float* const* pLevels, const int32_t* nLevels, int32_t numChannels,
                        QorHistogramSpec* pSpec) {
    if (QorResult r = firstOf(typeCheck(dataType), nullCheck(pLevels, nLevels, pSpec), channelsCheck(numChannels)))
        return r;
    return underDefaultControl([=]() -> QorResult {
        for (int c = 0; c < numChannels; ++c) {
            if (QorResult r = firstOf(nullCheck(pLevels[c]), levelCountCheck(nLevels + c, 1))) return r;
            if (!strictlyIncreasing(pLevels[c], nLevels[c])) return QOR_ERR_BAD_RANGE;
        }
        Record* const record = recordOf(pSpec);
        record->begin(dataType, numChannels, 0, nLevels);
        for (int c = 0; c < numChannels; ++c)
            for (int32_t k = 0; k < nLevels[c]; ++k) {
                if (dataType == qor32f)
                    record->levels<float>(c)[k] = pLevels[c][k];
                else
                    record->levels<int32_t>(c)[k] = truncated(double(pLevels[c][k]));
            }
        return QOR_OK;
    });
}

/// An infinite bound spaces like the largest float.
double spacingBound(float bound) { return std::clamp<double>(double(bound), -double(FLT_MAX), double(FLT_MAX)); }

/// Level k is k * width + lower, fused in double precision, with a width of single precision, that of a difference that
/// floats do not hold included: 3 levels or more bring it back.
void spaceUniformly(float lower, float upper, int32_t count, float* levels) {
    const double from = spacingBound(lower), span = spacingBound(upper) - from;
    const float rounded = static_cast<float>(span), bins = static_cast<float>(count - 1);
    const double width = rounded > FLT_MAX ? double(static_cast<float>(span / (count - 1))) : double(rounded / bins);
    for (int32_t k = 1; k < count - 1; ++k)
        levels[k] = static_cast<float>(std::min(__builtin_fma(double(k), width, from), double(FLT_MAX)));
    levels[0] = lower;
    levels[count - 1] = upper;
}

/// Returns the width of a bin.
double spaceUniformly(float lower, float upper, int32_t count, int32_t* levels) {
    const double from = spacingBound(lower), width = (spacingBound(upper) - from) / (count - 1);
    for (int32_t k = 1; k < count - 1; ++k) levels[k] = truncated(k * width + from);
    levels[0] = truncated(double(lower));
    levels[count - 1] = truncated(double(upper));
    return width;
}

QorResult histogramUniformInit(int32_t dataType, const float* pLowerLevel, const float* pUpperLevel,
                               const int32_t* nLevels, int32_t numChannels, QorHistogramSpec* pSpec) {
    if (QorResult r = firstOf(typeCheck(dataType), nullCheck(pLowerLevel, pUpperLevel, nLevels, pSpec),
                              channelsCheck(numChannels)))
        return r;
    return underDefaultControl([=]() -> QorResult {
        for (int c = 0; c < numChannels; ++c) {
            if (QorResult r = levelCountCheck(nLevels + c, 1)) return r;
            if (!(pLowerLevel[c] < pUpperLevel[c])) return QOR_ERR_BAD_RANGE;
        }
        Record* const record = recordOf(pSpec);
        record->begin(dataType, numChannels, 1, nLevels);
        QorResult result = QOR_OK;
        for (int c = 0; c < numChannels; ++c) {
            if (dataType == qor32f)
                spaceUniformly(pLowerLevel[c], pUpperLevel[c], nLevels[c], record->levels<float>(c));
            else if (spaceUniformly(pLowerLevel[c], pUpperLevel[c], nLevels[c], record->levels<int32_t>(c)) < 1.0)
                result = QOR_WARN_ADJUSTED;
        }
        return result;
    });
}

QorResult histogramLevels(const QorHistogramSpec* pSpec, float* const* ppLevels) {
    if (QorResult r = nullCheck(pSpec, ppLevels)) return r;
    const Record* const record = recordOf(pSpec);
    if (record->identifier != Record::kIdentifier) return QOR_ERR_BAD_ARG;
    if (anyNull(ppLevels, record->channels)) return QOR_ERR_NULL_PTR;
    return underDefaultControl([&] {
        for (int c = 0; c < record->channels; ++c)
            for (int32_t k = 0; k < record->counts[c]; ++k)
                ppLevels[c][k] = record->dataType == qor32f ? record->levels<float>(c)[k]
                                                            : static_cast<float>(record->levels<int32_t>(c)[k]);
        return QOR_OK;
    });
}

template <class T, Layout layout>
QorResult histogram(Image<const T> src, QorImageSize roi, int32_t* const* pHist, const QorHistogramSpec* pSpec,
                    uint8_t* pBuffer) {
    constexpr int n = channels(layout);
    if (isNull(src) || anyNull(pHist, n) || pSpec == nullptr || pBuffer == nullptr) return QOR_ERR_NULL_PTR;
    if (QorResult r = firstOf(sizeCheck(roi), stepCheck(src))) return r;
    if (QorResult r = rowCheck(src.step, int64_t{roi.width} * n * elementBytes<T>)) return r;
    const Record* const record = recordOf(pSpec);
    if (record->identifier != Record::kIdentifier) return QOR_ERR_BAD_ARG;
    Channel<Level<T>> out[n];
    for (int c = 0; c < n; ++c) out[c] = {record->levels<Level<T>>(c), record->counts[c], pHist[c]};
    if constexpr (sizeof(T) == 2) {
        if (tablePays(roi, out, n)) {
            countWords<T, n>(roi, src, out, reinterpret_cast<uint32_t*>(pBuffer));
            return QOR_OK;
        }
    }
    return countUnderControl<T, layout>(roi, src, out);
}

}  // namespace
}  // namespace qori::stats

#include "entries/histogram.inc"
