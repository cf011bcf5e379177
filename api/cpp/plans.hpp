// --- plans ----------------------------------------------------------------------------------------------------------
//
// A plan is made once for sizes, elements and what else its operation is about, and used by any number of threads at
// once: its calls are const. It moves and does not copy. Where it cannot be made it is false, status() says why
// (QOR_ERR_NO_MEMORY where there is none), and calls return that. Work memory is the last argument of a call; without
// it the call has some of its own, which costs an allocation.

namespace detail {

/** The memory of a plan and what its making said. */
template <class Record>
class Plan {
public:
    /** Of the making: QOR_OK, a warning or the error for which there is no plan; QOR_ERR_CONTEXT once it moved away. */
    QorResult status() const noexcept { return usable() && !memory_ ? QorResult(QOR_ERR_CONTEXT) : status_; }
    explicit operator bool() const noexcept { return usable() && memory_; }
    /** As the functions of qori.h take it. */
    const Record* get() const noexcept { return *this ? reinterpret_cast<const Record*>(memory_.data()) : nullptr; }

protected:
    /** Has the memory and fills it, unless the query failed. */
    template <class Fill>
    void make(QorResult query, int32_t bytes, int32_t initBytes, Fill&& fill) noexcept {
        status_ = query;
        if (query != QOR_OK) return;
        Buffer init;
        status_ = QOR_ERR_NO_MEMORY;
        if (!memory_.fits(bytes) || !init.fits(initBytes)) return;
        status_ = fill(reinterpret_cast<Record*>(memory_.data()), init.data());
    }
    void refuse(QorResult status) noexcept { status_ = status; }

private:
    bool usable() const noexcept {
        return status_ == QOR_OK || status_ == QOR_WARN_ADJUSTED || status_ == QOR_WARN_WARP_EMPTY;
    }
    Buffer memory_;
    QorResult status_ = QOR_ERR_CONTEXT;
};

inline QorResult need(Buffer& buffer, QorResult query, int32_t bytes) noexcept {
    return query < 0 ? query : buffer.fits(bytes) ? QOR_OK : QOR_ERR_NO_MEMORY;
}

}  // namespace detail

/** How pixels between pixels are made. */
class Interpolation {
public:
    static constexpr Interpolation nearest() noexcept { return Interpolation(interpNearest); }
    static constexpr Interpolation linear() noexcept { return Interpolation(interpLinear); }
    /** (0, 0.5) interpolates, (1, 0) is the B-spline. */
    static constexpr Interpolation cubic(double b = 0, double c = 0.5) noexcept {
        return Interpolation(interpCubic, b, c);
    }
    static constexpr Interpolation lanczos(uint32_t lobes = 3) noexcept {
        return Interpolation(interpLanczos, 0, 0, lobes);
    }
    /** Means of areas, reductions only. */
    static constexpr Interpolation super() noexcept { return Interpolation(interpSuper); }
    /** The filter widens with the reduction: linear, cubic and Lanczos, in resizes. */
    constexpr Interpolation antialiased() const noexcept { return Interpolation(kind, b, c, lobes, true); }

    QorInterpolationKind kind;
    double b, c;
    uint32_t lobes;
    bool widens;

private:
    constexpr explicit Interpolation(QorInterpolationKind how, double b0 = 0, double c0 = 0, uint32_t n = 3,
                                     bool wide = false) noexcept
        : kind(how), b(b0), c(c0), lobes(n), widens(wide) {}
};

/** A resize of images of T: 8u, 16u, 16s and 32f, and linear 64f. */
template <class T>
class ResizePlan : public detail::Plan<QorResizePlan> {
    static constexpr unsigned own = detail::keyOf<T>;
    static_assert(detail::found<decltype(detail::resize_get_size_0<own>())>,
                  "qori::ResizePlan<T> of 8u 16u 16s 32f 64f");

public:
    ResizePlan(QorImageSize src, QorImageSize dst, Interpolation how) noexcept : src_(src), dst_(dst), how_(how) {
        int32_t bytes = 0, initBytes = 0;
        const QorResult query = resize_get_size<T>(src, dst, how.kind, how.widens, &bytes, &initBytes);
        this->make(query, bytes, initBytes, [&](QorResizePlan* plan, uint8_t* init) { return fill(plan, init); });
    }
    QorImageSize src_size() const noexcept { return src_; }
    QorImageSize dst_size() const noexcept { return dst_; }

    /** The whole destination. */
    template <class A, class B, unsigned k = detail::key<detail::In<A>, detail::Out<B>>>
    [[nodiscard]] QorResult operator()(const A& src, B&& dst, const Border<T, detail::channels(k)>& border,
                                       Buffer& buffer) const noexcept {
        return detail::isSize(dst.size(), dst_.width, dst_.height) ? tile(src, dst, {0, 0}, border, buffer)
                                                                   : QOR_ERR_SIZE;
    }
    template <class A, class B, unsigned k = detail::key<detail::In<A>, detail::Out<B>>>
    [[nodiscard]] QorResult operator()(const A& src, B&& dst,
                                       const Border<T, detail::channels(k)>& border = {
                                           borderReplicate}) const noexcept {
        Buffer buffer;
        return (*this)(src, dst, border, buffer);
    }
    /** The part of the destination that has its first pixel at an offset, from the whole source. */
    template <class A, class B, unsigned k = detail::key<detail::In<A>, detail::Out<B>>>
    [[nodiscard]] QorResult tile(const A& src, B&& dst, QorPoint2D offset, const Border<T, detail::channels(k)>& border,
                                 Buffer& buffer) const noexcept {
        static_assert(detail::found<decltype(detail::resize_linear_0<k>())> && k >> 12 == detail::typeDigit<T>,
                      "qori::ResizePlan<T>: images of T in C1, C3 or C4, the destination not const");
        if (!*this) return this->status();
        const auto& srcV = detail::view(src);
        const auto& dstV = detail::view(dst);
        if (!detail::isSize(srcV.size(), src_.width, src_.height)) return QOR_ERR_SIZE;
        int32_t bytes = 0;
        QorPoint2D at{};
        const QorResult query =
            resize_get_buffer_size<T>(this->get(), dstV.size(), int32_t(detail::channels(k)), &bytes);
        if (query == QOR_WARN_NOTHING_TO_DO) return query;
        if (const QorResult r = detail::need(buffer, query, bytes)) return r;
        if (const QorResult r = resize_get_src_offset<T>(this->get(), offset, &at)) return r;
        return run<k>(View<const T, typename std::decay_t<decltype(srcV)>::Layout>(
                          srcV.data() ? srcV.at(at.x, at.y) : nullptr, srcV.step(), srcV.size()),
                      dstV, offset, border, buffer.data());
    }
    /** The source pixels that a part of the destination is made of, and the part trimmed to the destination. */
    [[nodiscard]] QorResult source_of(QorImageRect part, QorImageRect& src, QorImageRect& trimmed) const noexcept {
        return *this ? resize_get_src_roi<T>(this->get(), part, &src, &trimmed) : this->status();
    }
    /** How many pixels around the source the filter may reach. */
    [[nodiscard]] QorResult reach(QorBorderExtent& extent) const noexcept {
        return *this ? resize_get_border_size<T>(this->get(), &extent) : this->status();
    }

private:
    QorResult fill(QorResizePlan* plan, uint8_t* init) const noexcept {
        const auto b = static_cast<float>(how_.b), c = static_cast<float>(how_.c);
        if (how_.widens) {
            if (how_.kind == interpLinear) return resize_antialiasing_linear_init(src_, dst_, plan, init);
            if (how_.kind == interpCubic) return resize_antialiasing_cubic_init(src_, dst_, b, c, plan, init);
            return resize_antialiasing_lanczos_init(src_, dst_, how_.lobes, plan, init);
        }
        if (how_.kind == interpLinear) return resize_linear_init<T>(src_, dst_, plan);
        if constexpr (detail::found<decltype(detail::resize_cubic_init_0<own>())>) {
            if (how_.kind == interpNearest) return resize_nearest_init<T>(src_, dst_, plan);
            if (how_.kind == interpSuper) return resize_super_init<T>(src_, dst_, plan);
            if (how_.kind == interpCubic) return resize_cubic_init<T>(src_, dst_, b, c, plan, init);
            return resize_lanczos_init<T>(src_, dst_, how_.lobes, plan, init);
        }
        return QOR_ERR_UNSUPPORTED_MODE;
    }
    template <unsigned k, class A, class B, std::size_t N>
    QorResult run(const A& s, const B& d, QorPoint2D at, const Border<T, N>& border, uint8_t* buffer) const noexcept {
        const QorResizePlan* plan = this->get();
        [[maybe_unused]] const auto bordered = [&](auto member) {
            return member(s.data(), s.step(), d.data(), d.step(), at, d.size(), border.mode(), border.value().data(),
                          plan, buffer);
        };
        [[maybe_unused]] const auto open = [&](auto member) {
            return member(s.data(), s.step(), d.data(), d.step(), at, d.size(), plan, buffer);
        };
        if constexpr (detail::found<decltype(detail::resize_cubic_0<k>())>) {
            if (how_.widens) return bordered(detail::resize_antialiasing_0<k>());
            if (how_.kind == interpNearest) return open(detail::resize_nearest_0<k>());
            if (how_.kind == interpSuper) return open(detail::resize_super_0<k>());
            if (how_.kind == interpCubic) return bordered(detail::resize_cubic_0<k>());
            if (how_.kind == interpLanczos) return bordered(detail::resize_lanczos_0<k>());
        }
        return bordered(detail::resize_linear_0<k>());
    }
    QorImageSize src_, dst_;
    Interpolation how_;
};

/** An affine map of images of T in the layout L, C1, C3 or C4: c00, c01, c02, c10, c11, c12 take source positions to
 *  destination positions, inverse ones the other way. Nearest, linear or cubic. */
template <class T, class L = C1>
class WarpAffinePlan : public detail::Plan<QorWarpPlan> {
    static constexpr std::size_t count = detail::Facts<L>::channels;
    static constexpr int32_t channels = int32_t(count);
    static constexpr unsigned k = detail::keyOf<T, L>;
    static_assert(detail::found<decltype(detail::warp_affine_linear_0<k>())>,
                  "qori::WarpAffinePlan<T, L> of 8u 16u 16s 32f 64f: C1 C3 C4");

public:
    WarpAffinePlan(QorImageSize src, QorImageSize dst, const double (&matrix)[6], Interpolation how,
                   const Border<double, count>& border = {borderReplicate}, bool inverse = false) noexcept
        : src_(src), dst_(dst), kind_(how.kind) {
        int32_t bytes = 0, initBytes = 0;
        const int32_t type = detail::dataType<T>, mode = border.mode();
        const QorResult query =
            warp_affine_get_size(src, dst, type, matrix, how.kind, inverse, mode, &bytes, &initBytes);
        this->make(query, bytes, initBytes, [&](QorWarpPlan* plan, uint8_t* init) {
            const double* value = border.value().data();
            if (how.kind == interpNearest)
                return warp_affine_nearest_init(src, dst, type, matrix, inverse, channels, mode, value, 0, plan);
            if (how.kind == interpLinear)
                return warp_affine_linear_init(src, dst, type, matrix, inverse, channels, mode, value, 0, plan);
            return warp_affine_cubic_init(src, dst, type, matrix, inverse, channels, how.b, how.c, mode, value, 0, plan,
                                          init);
        });
    }
    QorImageSize src_size() const noexcept { return src_; }
    QorImageSize dst_size() const noexcept { return dst_; }

    /** The whole destination. */
    [[nodiscard]] QorResult operator()(View<const T, L> src, View<T, L> dst, Buffer& buffer) const noexcept {
        return detail::isSize(dst.size(), dst_.width, dst_.height) ? tile(src, dst, {0, 0}, buffer) : QOR_ERR_SIZE;
    }
    [[nodiscard]] QorResult operator()(View<const T, L> src, View<T, L> dst) const noexcept {
        Buffer buffer;
        return (*this)(src, dst, buffer);
    }
    /** The part of the destination that has its first pixel at an offset, from the whole source. */
    [[nodiscard]] QorResult tile(View<const T, L> src, View<T, L> dst, QorPoint2D offset,
                                 Buffer& buffer) const noexcept {
        if (!*this) return this->status();
        if (!detail::isSize(src.size(), src_.width, src_.height)) return QOR_ERR_SIZE;
        int32_t bytes = 0;
        const QorResult query = warp_get_buffer_size(this->get(), dst.size(), &bytes);
        if (query == QOR_WARN_NOTHING_TO_DO) return query;
        if (const QorResult r = detail::need(buffer, query, bytes)) return r;
        if (kind_ == interpNearest) return warp_affine_nearest(src, dst, offset, this->get(), buffer.data());
        if (kind_ == interpLinear) return warp_affine_linear(src, dst, offset, this->get(), buffer.data());
        return warp_affine_cubic(src, dst, offset, this->get(), buffer.data());
    }
    /** How many pixels around the source are read with borderReadAll. */
    [[nodiscard]] QorResult reach(QorBorderExtent& extent) const noexcept {
        return *this ? warp_get_border_size(this->get(), &extent) : this->status();
    }

private:
    QorImageSize src_, dst_;
    QorInterpolationKind kind_;
};

/** Weights of a filter of images of T in the layout L, C1, C3 or C4, centred on the pixel made whatever the kernel's
 *  anchor, and turned by 180 degrees. */
template <class T, class L = C1>
class LinearFilterPlan : public detail::Plan<QorLinearFilterPlan> {
    static constexpr std::size_t count = detail::Facts<L>::channels;
    static constexpr int32_t channels = int32_t(count);
    static_assert(detail::found<decltype(detail::filter_border_0<detail::keyOf<T, L>>())>,
                  "qori::LinearFilterPlan<T, L> of 8u 16u 16s 32f: C1 C3 C4");

public:
    explicit LinearFilterPlan(const Kernel<int16_t>& kernel, int32_t divisor = 1,
                              QorRoundingMode rounding = roundNearestEven) noexcept
        : kernel_(kernel.size()), kernelType_(qor16s) {
        prepare([&](QorLinearFilterPlan* plan, uint8_t*) {
            return filter_border_init_16s(kernel.data(), kernel_, divisor, detail::dataType<T>, channels, rounding,
                                          plan);
        });
    }
    explicit LinearFilterPlan(const Kernel<float>& kernel, QorRoundingMode rounding = roundNearestEven) noexcept
        : kernel_(kernel.size()), kernelType_(qor32f) {
        prepare([&](QorLinearFilterPlan* plan, uint8_t*) {
            return filter_border_init_32f(kernel.data(), kernel_, detail::dataType<T>, channels, rounding, plan);
        });
    }
    [[nodiscard]] QorResult operator()(View<const T, L> src, View<T, L> dst, const Border<T, count>& border,
                                       Buffer& buffer) const noexcept {
        if (!*this) return this->status();
        if (detail::differ(src, dst)) return QOR_ERR_SIZE;
        int32_t planBytes = 0, bytes = 0;
        const QorResult query = size_for(dst.size(), &planBytes, &bytes);
        if (const QorResult r = detail::need(buffer, query, bytes)) return r;
        return filter_border(src, dst, border, this->get(), buffer.data());
    }
    [[nodiscard]] QorResult operator()(View<const T, L> src, View<T, L> dst,
                                       const Border<T, count>& border = {borderReplicate}) const noexcept {
        Buffer buffer;
        return (*this)(src, dst, border, buffer);
    }

private:
    QorResult size_for(QorImageSize roi, int32_t* planBytes, int32_t* bytes) const noexcept {
        return filter_border_get_size(kernel_, roi, detail::dataType<T>, kernelType_, channels, planBytes, bytes);
    }
    template <class Fill>
    void prepare(Fill&& fill) noexcept {
        int32_t bytes = 0, bufferBytes = 0;
        const QorResult query = size_for({1, 1}, &bytes, &bufferBytes);
        this->make(query, bytes, 0, fill);
    }
    QorImageSize kernel_;
    int32_t kernelType_;
};
