namespace detail {

/** What a member that does not exist is; its arguments take anything, so that one message says so. */
struct Missing {};
struct Anything {
    template <class... T>
    constexpr Anything(const T&...) noexcept {}
};
template <class F>
inline constexpr bool found = !std::is_same_v<F, Missing>;

/** Reads and writes of images, as keys are made of them. */
template <class A>
struct Operand {
    static constexpr unsigned type = 0, layout = 0;
    static constexpr bool constant = true;
};
template <class T, class L>
struct Operand<View<T, L>> {
    static constexpr unsigned type = typeDigit<T>, layout = Facts<L>::digit;
    static constexpr bool constant = std::is_const_v<T>;
};
template <class T, class L>
struct Operand<const View<T, L>> : Operand<View<T, L>> {};
template <class T, class L>
struct Operand<InPlace<T, L>> : Operand<View<T, L>> {};
template <class T>
struct Operand<T*> {
    static constexpr unsigned type = typeDigit<T>, layout = 1;
    static constexpr bool constant = std::is_const_v<T>;
};
template <class A>
struct Operand<A&> : Operand<A> {};

template <class A>
struct ImageOf {
    static constexpr bool is = false;
};
template <class T, class L>
struct ImageOf<View<T, L>> {
    static constexpr bool is = true;
};
template <class A>
inline constexpr bool isImage = ImageOf<Bare<A>>::is;
template <class V>
using ElementOf = std::remove_const_t<typename Bare<V>::Element>;

template <class... A>
struct In {};
template <class... A>
struct Out {};

/** Four digits: element and layout of the sources, of the destinations; where there are none of one, those of the
 * other. 0, which no member has, where sources or destinations differ among themselves or a destination is read only.
 * Where an image keeps alpha, sources of four channels do. */
template <class Ins, class Outs, class W = void>
inline constexpr unsigned key = 0;
template <class... A, class... B, class W>
inline constexpr unsigned key<In<A...>, Out<B...>, W> = [] {
    [[maybe_unused]] constexpr unsigned alpha = Facts<AC4>::digit;
    [[maybe_unused]] constexpr bool keeps =
        ((Operand<A>::layout == alpha) || ... || false) || ((Operand<B>::layout == alpha) || ... || false);
    unsigned source = 0, target = 0;
    bool fits = !((Operand<B>::constant) || ... || false);
    [[maybe_unused]] const auto join = [&](unsigned& all, unsigned type, unsigned layout) {
        const unsigned one = type << 4 | layout;
        fits = fits && type && (all == 0 || all == one);
        all = one;
    };
    (join(source, Operand<A>::type, keeps && Operand<A>::layout == Facts<C4>::digit ? alpha : Operand<A>::layout), ...);
    (join(target, Operand<B>::type, Operand<B>::layout), ...);
    if (source == 0) source = target;
    if (target == 0) target = source;
    return fits ? typeDigit<W> << 16 | source << 8 | target : 0;
}();
template <class T, class L = C1>
inline constexpr unsigned keyOf = key<In<View<T, L>>, Out<>>;

/** Channels that the members of a key process. */
constexpr std::size_t channels(unsigned k) noexcept {
    constexpr std::size_t counts[] = {1, 1, 2, 3, 4, 3, 3, 4, 1, 1, 1, 1, 1, 1, 1, 1};
    return counts[k & 15];
}

/** Argument I of a function. */
template <unsigned I, class First, class... Rest>
struct Nth : Nth<I - 1, Rest...> {};
template <class First, class... Rest>
struct Nth<0, First, Rest...> {
    using type = First;
};
template <class F, unsigned I>
struct Argument {
    using type = Anything;
};
template <class R, class... P, unsigned I>
struct Argument<R(QORI_CALL*)(P...), I> : Nth<I, P...> {};
template <class R, class... P, unsigned I>
struct Argument<R(QORI_CALL*)(P...) noexcept, I> : Nth<I, P...> {};
template <class F, unsigned I>
using Arg = typename Argument<F, I>::type;
template <class A, class B>
struct Both {
    using type = A;
};
template <class B>
struct Both<Anything, B> {
    using type = B;
};
template <class A, class B>
using Either = typename Both<A, B>::type;

template <class T, std::size_t N>
struct ValueOf {
    using type = T;
};
template <class T, std::size_t N>
struct ValueOf<const T*, N> {
    using type = Pixel<T, N>;
};
/** A constant per channel, as the member takes it: T or const T*. */
template <class P, unsigned k>
using Value = typename ValueOf<P, channels(k)>::type;

template <class P, std::size_t N>
struct ListsOf {
    using type = Anything;
};
template <class T, std::size_t N>
struct ListsOf<T*, N> {
    using type = List<T>;
};
template <class T, std::size_t N>
struct ListsOf<T* const*, N> {
    using type = Lists<T, N>;
};
/** Lists that bring their counts, for the member's pointers: T* or T* const*. */
template <class P, unsigned k>
using Listed = typename ListsOf<P, channels(k)>::type;

template <class P, std::size_t N>
struct ResultsOf {
    using type = P;
};
template <class T, std::size_t N>
struct ResultsOf<T*, N> {
    using type = Results<T, N>;
};
template <class P, unsigned k>
using Result = typename ResultsOf<P, channels(k)>::type;

template <class P, std::size_t N>
struct BorderOf {
    using type = Border<P, N>;
};
template <class T, std::size_t N>
struct BorderOf<const T*, N> {
    using type = Border<T, N>;
};
template <std::size_t N>
struct BorderOf<Anything, N> {
    using type = Anything;
};
template <class P, unsigned k>
using Edge = typename BorderOf<P, channels(k)>::type;

template <class P>
struct KernelOf {
    using type = P;
};
template <class T>
struct KernelOf<const T*> {
    using type = Kernel<T>;
};
template <class P>
using Weights = typename KernelOf<P>::type;

template <class T, std::size_t N>
constexpr const T* pass(const Pixel<T, N>& value) noexcept {
    return value.data();
}
template <class T>
constexpr T pass(T value) noexcept {
    return value;
}
template <class P, class T, std::size_t N>
constexpr P beyond(const Border<T, N>& border) noexcept {
    if constexpr (std::is_pointer_v<P>)
        return border.value().data();
    else
        return border.value()[0];
}

template <class T, class L>
constexpr const View<T, L>& view(const View<T, L>& v) noexcept {
    return v;
}
template <class T, class L>
constexpr const View<T, L>& view(const InPlace<T, L>& v) noexcept {
    return v.image;
}

/** Views of one call have one size. */
template <class A>
constexpr bool differ(const A&) noexcept {
    return false;
}
template <class A, class B, class... Rest>
constexpr bool differ(const A& a, const B& b, const Rest&... rest) noexcept {
    return a.width() != b.width() || a.height() != b.height() || differ(a, rest...);
}
/** Whether there is one pixel for each block that an image of a size has, those cut short too. */
constexpr bool areBlocks(const QorImageSize& size, const QorImageSize& block, const QorImageSize& blocks) noexcept {
    return block.width < 1 || block.height < 1 ||
           (blocks.width == (int64_t(size.width) + block.width - 1) / block.width &&
            blocks.height == (int64_t(size.height) + block.height - 1) / block.height);
}
/** Whether rows of bytes hold as many bits, behind an offset, as there are pixels. */
constexpr bool holdsBits(const QorImageSize& bytes, int32_t offset, const QorImageSize& bits) noexcept {
    return bytes.height == bits.height && (int64_t(offset) + bits.width + 7) / 8 <= bytes.width;
}
constexpr bool isSize(const QorImageSize& a, int64_t width, int64_t height) noexcept {
    return a.width == width && a.height == height;
}

template <class T>
inline constexpr int32_t dataType = 0;
template <>
inline constexpr int32_t dataType<uint8_t> = qor8u;
template <>
inline constexpr int32_t dataType<uint16_t> = qor16u;
template <>
inline constexpr int32_t dataType<int16_t> = qor16s;
template <>
inline constexpr int32_t dataType<float> = qor32f;
template <>
inline constexpr int32_t dataType<double> = qor64f;

}  // namespace detail
