/// One kind of event that can be collected: a category and a subcategory, as the adapters' library reports them.
#ifndef SENSOR_AGENTCOMMON_INCLUDE_SCOPEEVENT_H
#define SENSOR_AGENTCOMMON_INCLUDE_SCOPEEVENT_H

/// Never changed after construction, so it may be read by any thread. Held through ZTCPointer.
class ZTCScopeEvent {
public:
    ZTCScopeEvent(unsigned char aCategory, unsigned char aSubcategory)
        : mCategory(aCategory), mSubcategory(aSubcategory) {}
    virtual ~ZTCScopeEvent() = default;

    unsigned char getCategory() const { return mCategory; }

    /// A single bit of the category's mask.
    unsigned char getSubcategory() const { return mSubcategory; }

    /// The category in the high byte, the subcategory in the low byte.
    unsigned short getKeyForm() const { return static_cast<unsigned short>(mCategory << 8 | mSubcategory); }

private:
    unsigned char mCategory;
    unsigned char mSubcategory;
};

#endif
