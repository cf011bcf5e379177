
/** An image that owns its memory: rows aligned to 64 bytes, contents undefined. False where there is no memory. */
template <class T, class L = C1>
class Image {
public:
    Image() noexcept = default;
    explicit Image(QorImageSize size) noexcept : size_(size) {
        data_ = allocate<T, L>(size.width, size.height, &step_);
    }
    Image(Image&& other) noexcept : data_(other.data_), step_(other.step_), size_(other.size_) {
        other.data_ = nullptr;
    }
    Image& operator=(Image&& other) noexcept {
        if (this != &other) {
            qoriFree(data_);
            data_ = other.data_, step_ = other.step_, size_ = other.size_;
            other.data_ = nullptr;
        }
        return *this;
    }
    ~Image() { qoriFree(data_); }

    View<T, L> view() noexcept { return {data_, step_, size_}; }
    View<const T, L> view() const noexcept { return {data_, step_, size_}; }
    operator View<T, L>() noexcept { return view(); }
    operator View<const T, L>() const noexcept { return view(); }
    QorImageSize size() const noexcept { return size_; }
    int32_t width() const noexcept { return size_.width; }
    int32_t height() const noexcept { return size_.height; }
    int32_t step() const noexcept { return step_; }
    T* at(int32_t x, int32_t y) noexcept { return view().at(x, y); }
    const T* at(int32_t x, int32_t y) const noexcept { return view().at(x, y); }
    explicit operator bool() const noexcept { return data_ != nullptr; }

private:
    T* data_ = nullptr;
    int32_t step_ = 0;
    QorImageSize size_ = {0, 0};
};

template <class T, class L>
InPlace<T, L> in_place(Image<T, L>& image) noexcept {
    return {image.view()};
}
template <class T>
View<T, AC4> keep_alpha(Image<T, C4>& image) noexcept {
    return keep_alpha(image.view());
}
template <class T>
View<const T, AC4> keep_alpha(const Image<T, C4>& image) noexcept {
    return keep_alpha(image.view());
}

namespace detail {
template <class T, class L>
struct ImageOf<Image<T, L>> {
    static constexpr bool is = true;
};
template <class T, class L>
struct Operand<Image<T, L>> : Operand<View<T, L>> {};
template <class T, class L>
struct Operand<const Image<T, L>> : Operand<View<const T, L>> {};
template <class T, class L>
View<T, L> view(Image<T, L>& image) noexcept {
    return image.view();
}
template <class T, class L>
View<const T, L> view(const Image<T, L>& image) noexcept {
    return image.view();
}
}  // namespace detail
