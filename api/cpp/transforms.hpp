namespace detail {

/** The makers and releasers of Fourier plans: by family, and by elements. */
template <class T>
struct DftMaker;
template <>
struct DftMaker<float> {
    static QorResult make(QorFft2DPlan** p, QorImageSize s, QorFftNormFlag n) noexcept {
        return dft_init_alloc_r_32f(p, s, n, hintFast);
    }
    static QorResult bytes(const QorFft2DPlan* p, int32_t* n) noexcept { return dft_get_buf_size_r_32f(p, n); }
    static QorResult release(QorFft2DPlan* p) noexcept { return dft_free_r_32f(p); }
};
template <>
struct DftMaker<int32_t> {
    static QorResult make(QorFft2DPlan** p, QorImageSize s, QorFftNormFlag n) noexcept {
        return dft_init_alloc_r_32s(p, s, n, hintFast);
    }
    static QorResult bytes(const QorFft2DPlan* p, int32_t* n) noexcept { return dft_get_buf_size_r_32s(p, n); }
    static QorResult release(QorFft2DPlan* p) noexcept { return dft_free_r_32s(p); }
};
template <>
struct DftMaker<QorComplex32f> {
    static QorResult make(QorFft2DPlan** p, QorImageSize s, QorFftNormFlag n) noexcept {
        return dft_init_alloc_c_32fc(p, s, n, hintFast);
    }
    static QorResult bytes(const QorFft2DPlan* p, int32_t* n) noexcept { return dft_get_buf_size_c_32fc(p, n); }
    static QorResult release(QorFft2DPlan* p) noexcept { return dft_free_c_32fc(p); }
};

/** The exponent of a power of two; -1, which no transform takes, of other numbers. */
constexpr int32_t orderOf(int32_t length) noexcept {
    int32_t order = 0;
    while (order < 30 && (int32_t(1) << order) < length) ++order;
    return (int32_t(1) << order) == length ? order : -1;
}
template <class T>
struct FftMaker;
template <>
struct FftMaker<float> {
    static QorResult make(QorFft2DPlan** p, QorImageSize s, QorFftNormFlag n) noexcept {
        return fft_init_alloc_r_32f(p, orderOf(s.width), orderOf(s.height), n, hintFast);
    }
    static QorResult bytes(const QorFft2DPlan* p, int32_t* n) noexcept { return fft_get_buf_size_r_32f(p, n); }
    static QorResult release(QorFft2DPlan* p) noexcept { return fft_free_r_32f(p); }
};
template <>
struct FftMaker<int32_t> {
    static QorResult make(QorFft2DPlan** p, QorImageSize s, QorFftNormFlag n) noexcept {
        return fft_init_alloc_r_32s(p, orderOf(s.width), orderOf(s.height), n, hintFast);
    }
    static QorResult bytes(const QorFft2DPlan* p, int32_t* n) noexcept { return fft_get_buf_size_r_32s(p, n); }
    static QorResult release(QorFft2DPlan* p) noexcept { return fft_free_r_32s(p); }
};
template <>
struct FftMaker<QorComplex32f> {
    static QorResult make(QorFft2DPlan** p, QorImageSize s, QorFftNormFlag n) noexcept {
        return fft_init_alloc_c_32fc(p, orderOf(s.width), orderOf(s.height), n, hintFast);
    }
    static QorResult bytes(const QorFft2DPlan* p, int32_t* n) noexcept { return fft_get_buf_size_c_32fc(p, n); }
    static QorResult release(QorFft2DPlan* p) noexcept { return fft_free_c_32fc(p); }
};
struct DctMaker {
    static QorResult make(QorDct2DPlan** p, QorImageSize s, QorAccuracyHint h) noexcept {
        return dct_fwd_init_alloc_32f(p, s, h);
    }
    static QorResult bytes(const QorDct2DPlan* p, int32_t* n) noexcept { return dct_fwd_get_buf_size_32f(p, n); }
    static QorResult release(QorDct2DPlan* p) noexcept { return dct_fwd_free_32f(p); }
};

/** A plan that the library allocates: its record, its size, and the bytes that a call works in. */
template <class Maker, class Record, class Option>
class LibraryPlan {
public:
    LibraryPlan(QorImageSize size, Option option) noexcept : size_(size) {
        status_ = Maker::make(&plan_, size, option);
        if (status_ == QOR_OK) status_ = Maker::bytes(plan_, &bytes_);
    }
    LibraryPlan(LibraryPlan&& other) noexcept
        : plan_(other.plan_), size_(other.size_), bytes_(other.bytes_), status_(other.status_) {
        other.empty();
    }
    LibraryPlan& operator=(LibraryPlan&& other) noexcept {
        if (this != &other) {
            release();
            plan_ = other.plan_, size_ = other.size_, bytes_ = other.bytes_, status_ = other.status_;
            other.empty();
        }
        return *this;
    }
    ~LibraryPlan() { release(); }
    QorResult status() const noexcept { return status_; }
    explicit operator bool() const noexcept { return status_ == QOR_OK; }
    const Record* get() const noexcept { return plan_; }
    QorImageSize size() const noexcept { return size_; }

protected:
    /** Runs a call whose images have the plan's size. */
    template <class Call, class... V>
    QorResult run(Buffer& buffer, Call&& call, const V&... images) const noexcept {
        if (status_ != QOR_OK) return status_;
        if (!(isSize(images.size(), size_.width, size_.height) && ...)) return QOR_ERR_SIZE;
        return buffer.fits(bytes_) ? call(buffer.data()) : QOR_ERR_NO_MEMORY;
    }

private:
    void empty() noexcept { plan_ = nullptr, status_ = QOR_ERR_CONTEXT; }
    void release() noexcept {
        if (plan_) static_cast<void>(Maker::release(plan_));
    }
    Record* plan_ = nullptr;
    QorImageSize size_;
    int32_t bytes_ = 0;
    QorResult status_;
};

/** Fourier transforms. T: float for real images and packed spectra, int32_t for the spectra of 8u images,
 * QorComplex32f. */
template <template <class> class Maker, class T, bool powers>
class FourierPlan : public LibraryPlan<Maker<T>, QorFft2DPlan, QorFftNormFlag> {
    static constexpr bool complex = std::is_same_v<T, QorComplex32f>, integers = std::is_same_v<T, int32_t>;
    static_assert(complex || integers || std::is_same_v<T, float>,
                  "qori::DftPlan and FftPlan of float, of int32_t for 8u images, and of QorComplex32f");

public:
    explicit FourierPlan(QorImageSize size, QorFftNormFlag norm = fftDivInvByN) noexcept
        : LibraryPlan<Maker<T>, QorFft2DPlan, QorFftNormFlag>(size, norm) {}

    /** To a spectrum; of 8u images times 2^-scale. */
    template <class A, class B, If<isImage<A>> = 0>
    [[nodiscard]] QorResult forward(const A& src, B&& dst, Buffer& buffer, int32_t scale = 0) const noexcept {
        const auto go = [&](uint8_t* work) {
            if constexpr (integers && powers)
                return fft_fwd_r_to_pack(src, dst, this->get(), scale, work);
            else if constexpr (integers)
                return dft_fwd_r_to_pack(src, dst, this->get(), scale, work);
            else if constexpr (complex && powers)
                return fft_fwd_c_to_c(src, dst, this->get(), work);
            else if constexpr (complex)
                return dft_fwd_c_to_c(src, dst, this->get(), work);
            else if constexpr (powers)
                return fft_fwd_r_to_pack(src, dst, this->get(), work);
            else
                return dft_fwd_r_to_pack(src, dst, this->get(), work);
        };
        return scale && !integers ? QOR_ERR_BAD_ARG : this->run(buffer, go, src, dst);
    }
    template <class A, class B, If<isImage<A>> = 0>
    [[nodiscard]] QorResult forward(const A& src, B&& dst, int32_t scale = 0) const noexcept {
        Buffer buffer;
        return forward(src, dst, buffer, scale);
    }
    template <class E, class L>
    [[nodiscard]] QorResult forward(const InPlace<E, L>& src, Buffer& buffer) const noexcept {
        const auto go = [&](uint8_t* work) {
            if constexpr (complex && powers)
                return fft_fwd_c_to_c(src, this->get(), work);
            else if constexpr (complex)
                return dft_fwd_c_to_c(src, this->get(), work);
            else if constexpr (powers)
                return fft_fwd_r_to_pack(src, this->get(), work);
            else
                return dft_fwd_r_to_pack(src, this->get(), work);
        };
        static_assert(!integers, "qori: transforms of 8u images have no form in place");
        return this->run(buffer, go, src.image);
    }
    template <class E, class L>
    [[nodiscard]] QorResult forward(const InPlace<E, L>& src) const noexcept {
        Buffer buffer;
        return forward(src, buffer);
    }
    /** From a spectrum; to 8u images times 2^-scale. */
    template <class A, class B, If<isImage<A>> = 0>
    [[nodiscard]] QorResult inverse(const A& src, B&& dst, Buffer& buffer, int32_t scale = 0) const noexcept {
        const auto go = [&](uint8_t* work) {
            if constexpr (integers && powers)
                return fft_inv_pack_to_r(src, dst, this->get(), scale, work);
            else if constexpr (integers)
                return dft_inv_pack_to_r(src, dst, this->get(), scale, work);
            else if constexpr (complex && powers)
                return fft_inv_c_to_c(src, dst, this->get(), work);
            else if constexpr (complex)
                return dft_inv_c_to_c(src, dst, this->get(), work);
            else if constexpr (powers)
                return fft_inv_pack_to_r(src, dst, this->get(), work);
            else
                return dft_inv_pack_to_r(src, dst, this->get(), work);
        };
        return scale && !integers ? QOR_ERR_BAD_ARG : this->run(buffer, go, src, dst);
    }
    template <class A, class B, If<isImage<A>> = 0>
    [[nodiscard]] QorResult inverse(const A& src, B&& dst, int32_t scale = 0) const noexcept {
        Buffer buffer;
        return inverse(src, dst, buffer, scale);
    }
    template <class E, class L>
    [[nodiscard]] QorResult inverse(const InPlace<E, L>& src, Buffer& buffer) const noexcept {
        const auto go = [&](uint8_t* work) {
            if constexpr (complex && powers)
                return fft_inv_c_to_c(src, this->get(), work);
            else if constexpr (complex)
                return dft_inv_c_to_c(src, this->get(), work);
            else if constexpr (powers)
                return fft_inv_pack_to_r(src, this->get(), work);
            else
                return dft_inv_pack_to_r(src, this->get(), work);
        };
        static_assert(!integers, "qori: transforms of 8u images have no form in place");
        return this->run(buffer, go, src.image);
    }
    template <class E, class L>
    [[nodiscard]] QorResult inverse(const InPlace<E, L>& src) const noexcept {
        Buffer buffer;
        return inverse(src, buffer);
    }
};

}  // namespace detail

/** A Fourier transform of any size. */
template <class T>
class DftPlan : public detail::FourierPlan<detail::DftMaker, T, false> {
public:
    using detail::FourierPlan<detail::DftMaker, T, false>::FourierPlan;
};

/** A Fourier transform whose sides are powers of two; of others the status is QOR_ERR_ORDER. */
template <class T>
class FftPlan : public detail::FourierPlan<detail::FftMaker, T, true> {
public:
    using detail::FourierPlan<detail::FftMaker, T, true>::FourierPlan;
};

/** A cosine transform of images of 32f of any size. */
class DctPlan : public detail::LibraryPlan<detail::DctMaker, QorDct2DPlan, QorAccuracyHint> {
public:
    explicit DctPlan(QorImageSize size, QorAccuracyHint hint = hintFast) noexcept
        : detail::LibraryPlan<detail::DctMaker, QorDct2DPlan, QorAccuracyHint>(size, hint) {}
    template <class A, class B>
    [[nodiscard]] QorResult forward(const A& src, B&& dst, Buffer& buffer) const noexcept {
        return run(
            buffer, [&](uint8_t* work) { return dct_fwd(src, dst, this->get(), work); }, src, dst);
    }
    template <class A, class B>
    [[nodiscard]] QorResult forward(const A& src, B&& dst) const noexcept {
        Buffer buffer;
        return forward(src, dst, buffer);
    }
    template <class A, class B>
    [[nodiscard]] QorResult inverse(const A& src, B&& dst, Buffer& buffer) const noexcept {
        return run(
            buffer, [&](uint8_t* work) { return dct_inv(src, dst, this->get(), work); }, src, dst);
    }
    template <class A, class B>
    [[nodiscard]] QorResult inverse(const A& src, B&& dst) const noexcept {
        Buffer buffer;
        return inverse(src, dst, buffer);
    }
};

/** Levels of histograms of images of T in the layout L, C1, C3 or C4. Counts are of levels, one more than bins. */
template <class T, class L = C1>
class HistogramPlan : public detail::Plan<QorHistogramSpec> {
    static constexpr std::size_t count = detail::Facts<L>::channels;
    static constexpr int32_t channels = int32_t(count);
    static constexpr unsigned k = detail::keyOf<T, L>;
    static_assert(detail::found<decltype(detail::histogram_0<k>())>,
                  "qori::HistogramPlan<T, L> of 8u 16u 16s 32f: C1 C3 C4");

public:
    /** Given levels, a list for each channel. */
    HistogramPlan(const float* const (&levels)[count], const Pixel<int32_t, count>& counts) noexcept {
        prepare(counts, 0, [&](QorHistogramSpec* plan, uint8_t*) {
            return histogram_init(detail::dataType<T>, levels, counts.data(), channels, plan);
        });
    }
    /** Levels spaced evenly from the lower to the upper one. */
    HistogramPlan(const Pixel<float, count>& lower, const Pixel<float, count>& upper,
                  const Pixel<int32_t, count>& counts) noexcept {
        prepare(counts, 1, [&](QorHistogramSpec* plan, uint8_t*) {
            return histogram_uniform_init(detail::dataType<T>, lower.data(), upper.data(), counts.data(), channels,
                                          plan);
        });
    }
    /** hist: bins, or a list of bins for each channel. */
    [[nodiscard]] QorResult operator()(View<const T, L> src, detail::Arg<decltype(detail::histogram_0<k>()), 3> hist,
                                       Buffer& buffer) const noexcept {
        if (!*this) return this->status();
        return buffer.fits(bytes_) ? histogram(src, hist, this->get(), buffer.data()) : QOR_ERR_NO_MEMORY;
    }
    [[nodiscard]] QorResult operator()(View<const T, L> src,
                                       detail::Arg<decltype(detail::histogram_0<k>()), 3> hist) const noexcept {
        Buffer buffer;
        return (*this)(src, hist, buffer);
    }
    /** The levels as they are used: a list for each channel. */
    [[nodiscard]] QorResult levels(float* const (&lists)[count]) const noexcept {
        return *this ? histogram_get_levels(this->get(), lists) : this->status();
    }

private:
    template <class Fill>
    void prepare(const Pixel<int32_t, count>& counts, int32_t uniform, Fill&& fill) noexcept {
        int32_t bytes = 0;
        const QorResult query =
            histogram_get_buffer_size(detail::dataType<T>, {1, 1}, counts.data(), channels, uniform, &bytes, &bytes_);
        this->make(query, bytes, 0, fill);
    }
    int32_t bytes_ = 0;
};

/** Descriptors of oriented gradients of windows of images. */
class HogPlan : public detail::Plan<QorHogPlan> {
public:
    explicit HogPlan(const QorHogConfig& config) noexcept {
        int32_t bytes = 0;
        const QorResult query = hog_get_size(&config, &bytes);
        make(query, bytes, 0, [&](QorHogPlan* plan, uint8_t*) { return hog_init(&config, plan); });
        if (*this) refuse(hog_get_descriptor_size(get(), &bytes_));
    }
    /** Floats of the descriptor of one window. */
    int32_t descriptor_floats() const noexcept { return bytes_ / int32_t(sizeof(float)); }

    /** Descriptors of windows by their top-left corners, one after the other. */
    template <class A, unsigned k = detail::key<detail::In<A>, detail::Out<>>, class F = decltype(detail::hog_0<k>())>
    [[nodiscard]] QorResult operator()(const A& src, const QorPoint2D* locations, int32_t count, float* dst,
                                       const detail::Edge<detail::Arg<F, 8>, k>& border,
                                       Buffer& buffer) const noexcept {
        if (status() < 0) return status();
        int32_t bytes = 0;
        const QorResult query = hog_get_buffer_size(get(), src.size(), &bytes);
        if (const QorResult r = detail::need(buffer, query, bytes)) return r;
        return hog(src, locations, count, dst, get(), border, buffer.data());
    }
    template <class A, unsigned k = detail::key<detail::In<A>, detail::Out<>>, class F = decltype(detail::hog_0<k>())>
    [[nodiscard]] QorResult operator()(const A& src, const QorPoint2D* locations, int32_t count, float* dst,
                                       const detail::Edge<detail::Arg<F, 8>, k>& border = {
                                           borderReplicate}) const noexcept {
        Buffer buffer;
        return (*this)(src, locations, count, dst, border, buffer);
    }

private:
    int32_t bytes_ = 0;
};

/** Weights of adaptive thresholds of 8u images by Gaussian means over squares of odd side. */
class AdaptiveGaussPlan : public detail::Plan<QorAdaptiveGaussSpec> {
public:
    explicit AdaptiveGaussPlan(QorImageSize square, float sigma = 0) noexcept : square_(square) {
        int32_t bytes = 0, bufferBytes = 0;
        const QorResult query =
            threshold_adaptive_gauss_get_buffer_size({1, 1}, square, qor8u, 1, &bytes, &bufferBytes);
        make(query, bytes, 0, [&](QorAdaptiveGaussSpec* plan, uint8_t*) {
            return threshold_adaptive_gauss_init({1, 1}, square, qor8u, 1, sigma, plan);
        });
    }
    [[nodiscard]] QorResult operator()(View<const uint8_t> src, View<uint8_t> dst, float delta,
                                       const Border<uint8_t, 1>& border, uint8_t above, uint8_t below,
                                       Buffer& buffer) const noexcept {
        if (const QorResult r = prepare(src.size(), buffer)) return r;
        return threshold_adaptive_gauss(src, dst, delta, above, below, border, get(), buffer.data());
    }
    [[nodiscard]] QorResult operator()(View<const uint8_t> src, View<uint8_t> dst, float delta,
                                       const Border<uint8_t, 1>& border = {borderReplicate}, uint8_t above = 255,
                                       uint8_t below = 0) const noexcept {
        Buffer buffer;
        return (*this)(src, dst, delta, border, above, below, buffer);
    }
    [[nodiscard]] QorResult operator()(const InPlace<uint8_t, C1>& src, float delta, const Border<uint8_t, 1>& border,
                                       uint8_t above, uint8_t below, Buffer& buffer) const noexcept {
        if (const QorResult r = prepare(src.image.size(), buffer)) return r;
        return threshold_adaptive_gauss(src, delta, above, below, border, get(), buffer.data());
    }
    [[nodiscard]] QorResult operator()(const InPlace<uint8_t, C1>& src, float delta,
                                       const Border<uint8_t, 1>& border = {borderReplicate}, uint8_t above = 255,
                                       uint8_t below = 0) const noexcept {
        Buffer buffer;
        return (*this)(src, delta, border, above, below, buffer);
    }

private:
    QorResult prepare(QorImageSize roi, Buffer& buffer) const noexcept {
        if (!*this) return status();
        int32_t planBytes = 0, bytes = 0;
        const QorResult query = threshold_adaptive_gauss_get_buffer_size(roi, square_, qor8u, 1, &planBytes, &bytes);
        return detail::need(buffer, query, bytes);
    }
    QorImageSize square_;
};
