
/** One element per channel: {1, 2, 3}, or of one channel 1. */
template <class T, std::size_t N>
class Pixel {
public:
    constexpr Pixel() noexcept = default;
    template <class... U, detail::If<sizeof...(U) == N && (std::is_convertible_v<U, T> && ...)> = 0>
    constexpr Pixel(U... channels) noexcept : values_{static_cast<T>(channels)...} {}
    constexpr Pixel(const T (&channels)[N]) noexcept {
        for (std::size_t i = 0; i < N; ++i) values_[i] = channels[i];
    }
    constexpr T& operator[](int channel) noexcept { return values_[channel]; }
    constexpr const T& operator[](int channel) const noexcept { return values_[channel]; }
    constexpr T* data() noexcept { return values_; }
    constexpr const T* data() const noexcept { return values_; }
    static constexpr std::size_t size() noexcept { return N; }

private:
    T values_[N] = {};
};

/** A list in memory that another owns: pointer and number of elements, from an array, a vector, a span or the like, or
 *  {pointer, number}; where T is const also from its elements, {0, 128, 256}, for the duration of a call. What is
 * longer than 32 bits say is empty. */
template <class T>
class List {
public:
    constexpr List(T* data, int32_t size) noexcept : data_(data), size_(size) {}
    template <std::size_t n>
    constexpr List(T (&array)[n]) noexcept : List(array, int32_t(n)) {}
    template <class S, detail::If<detail::isSpan<S, T>> = 0>
    constexpr List(S&& span) noexcept : List(span.data(), detail::counted(span.size())) {}
    template <class U, detail::If<std::is_same_v<const U, T>> = 0>
    constexpr List(std::initializer_list<U> elements) noexcept
        : List(elements.begin(), detail::counted(elements.size())) {}
    constexpr T* data() const noexcept { return data_; }
    constexpr int32_t size() const noexcept { return size_; }
    constexpr int32_t counts() const noexcept { return size_; }

private:
    T* data_;
    int32_t size_;
};

/** One for each of three or four channels: {red, green, blue}. */
template <class T, std::size_t N>
class Lists {
public:
    template <std::size_t M = N, detail::If<M == 3> = 0>
    constexpr Lists(List<T> a, List<T> b, List<T> c) noexcept
        : data_{a.data(), b.data(), c.data()}, counts_(a.size(), b.size(), c.size()) {}
    template <std::size_t M = N, detail::If<M == 4> = 0>
    constexpr Lists(List<T> a, List<T> b, List<T> c, List<T> d) noexcept
        : data_{a.data(), b.data(), c.data(), d.data()}, counts_(a.size(), b.size(), c.size(), d.size()) {}
    constexpr T* const* data() const noexcept { return data_; }
    constexpr const Pixel<int32_t, N>& counts() const noexcept { return counts_; }

private:
    T* data_[N];
    Pixel<int32_t, N> counts_;
};

namespace detail {

/** Whether lists have as many elements as others, or so many less. */
template <class A, class B>
constexpr bool haveCounts(const List<A>& all, const List<B>& lists, int32_t less) noexcept {
    return lists.size() == all.size() - less;
}
template <class A, class B, std::size_t N>
constexpr bool haveCounts(const Lists<A, N>& all, const Lists<B, N>& lists, int32_t less) noexcept {
    for (int i = 0; i < int(N); ++i)
        if (lists.counts()[i] != all.counts()[i] - less) return false;
    return true;
}

/** Where an operation puts a result per channel: a variable (of one channel), an array, a Pixel or the like. */
template <class T, std::size_t N>
class Results {
public:
    constexpr Results(T (&results)[N]) noexcept : data(results) {}
    template <std::size_t M = N, If<M == 1> = 0>
    constexpr Results(T& result) noexcept : data(&result) {}
    template <class S, If<isSpan<S&, T> && sizeof(S) == N * sizeof(T)> = 0>
    constexpr Results(S& results) noexcept : data(results.data()) {}
    T* data;
};

}  // namespace detail

/** Weights of a filter, or the mask of a morphological operation, with the anchor that lies on the pixel made. */
template <class T>
class Kernel {
public:
    constexpr Kernel(const T* weights, QorImageSize size, QorPoint2D anchor) noexcept
        : data_(weights), size_(size), anchor_(anchor) {}
    /** The anchor is the middle: width / 2, height / 2, rounded down. */
    constexpr Kernel(const T* weights, QorImageSize size) noexcept
        : Kernel(weights, size, {size.width / 2, size.height / 2}) {}
    template <std::size_t H, std::size_t W>
    constexpr Kernel(const T (&rows)[H][W]) noexcept : Kernel(rows[0], {int32_t(W), int32_t(H)}) {}
    constexpr const T* data() const noexcept { return data_; }
    constexpr QorImageSize size() const noexcept { return size_; }
    constexpr QorPoint2D anchor() const noexcept { return anchor_; }

private:
    const T* data_;
    QorImageSize size_;
    QorPoint2D anchor_;
};

/** Pixels around the one made: {width, height}, anchored in the middle, or {width, height, x, y}. */
class Window {
public:
    constexpr Window(int32_t width, int32_t height) noexcept : Window(width, height, width / 2, height / 2) {}
    constexpr Window(int32_t width, int32_t height, int32_t x, int32_t y) noexcept
        : size_{width, height}, anchor_{x, y} {}
    constexpr Window(QorImageSize size) noexcept : Window(size.width, size.height) {}
    constexpr Window(QorImageSize size, QorPoint2D anchor) noexcept : size_(size), anchor_(anchor) {}
    constexpr QorImageSize size() const noexcept { return size_; }
    constexpr QorPoint2D anchor() const noexcept { return anchor_; }

private:
    QorImageSize size_;
    QorPoint2D anchor_;
};

/** What lies beyond an image: borderReplicate and so on, or {borderConstant, value per channel}. */
template <class T, std::size_t N>
class Border {
public:
    constexpr Border(int32_t mode) noexcept : mode_(mode) {}
    constexpr Border(int32_t mode, const Pixel<T, N>& value) noexcept : mode_(mode), value_(value) {}
    constexpr int32_t mode() const noexcept { return mode_; }
    constexpr const Pixel<T, N>& value() const noexcept { return value_; }

private:
    int32_t mode_;
    Pixel<T, N> value_;
};

/** Bytes for an operation to work in, aligned to 64. Grows and never shrinks; keep one per thread across calls. */
class Buffer {
public:
    Buffer() noexcept = default;
    explicit Buffer(int32_t bytes) noexcept { reserve(bytes); }
    Buffer(Buffer&& other) noexcept : data_(other.data_), bytes_(other.bytes_) {
        other.data_ = nullptr, other.bytes_ = 0;
    }
    Buffer& operator=(Buffer&& other) noexcept {
        if (this != &other) {
            qoriFree(data_);
            data_ = other.data_, bytes_ = other.bytes_;
            other.data_ = nullptr, other.bytes_ = 0;
        }
        return *this;
    }
    ~Buffer() { qoriFree(data_); }
    /** At least as many bytes, whose contents are lost; false where there is no memory: then the old ones stay. */
    [[nodiscard]] bool fits(int32_t bytes) noexcept {
        reserve(bytes);
        return data_ && bytes_ >= bytes;
    }
    uint8_t* data() const noexcept { return data_; }
    int32_t bytes() const noexcept { return bytes_; }
    explicit operator bool() const noexcept { return data_ != nullptr; }

private:
    void reserve(int32_t bytes) noexcept {
        if (data_ && bytes_ >= bytes) return;
        int32_t step;
        const int32_t wanted = bytes < 64 ? 64 : bytes;
        uint8_t* grown = qoriMalloc_8u_C1(wanted, 1, &step);
        if (!grown) return;
        qoriFree(data_);
        data_ = grown, bytes_ = wanted;
    }
    uint8_t* data_ = nullptr;
    int32_t bytes_ = 0;
};

/** The header's words for a status. */
inline const char* status_text(QorResult status) noexcept {
    switch (status) {
        // @TEXTS@
        default: return "A status that this header does not know.";
    }
}

#if defined(__cpp_exceptions)
/** An error's status and the header's words for it. */
class Error : public std::exception {
public:
    explicit Error(QorResult status) noexcept : status_(status) {}
    QorResult status() const noexcept { return status_; }
    const char* what() const noexcept override { return status_text(status_); }

private:
    QorResult status_;
};
#endif

/** Passes successes and warnings on; an error throws qori::Error or, without exceptions, ends the program. */
inline QorResult check(QorResult status) {
    if (status < 0) {
#if defined(__cpp_exceptions)
        throw Error(status);
#else
        std::abort();
#endif
    }
    return status;
}
