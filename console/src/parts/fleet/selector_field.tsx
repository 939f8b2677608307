/// Which hosts are looked at: the same words as after --on. It is sent when somebody is done with it.
export function SelectorField({ value, onChange }: { value: string; onChange: (selector: string) => void }) {
    return (
        <label>Selector <input key={value} class="mono selector" name="selector" defaultValue={value} placeholder="env=test,!old or web-*" spellcheck={false} autocomplete="off"
            onChange={(event) => onChange(event.currentTarget.value.trim())} /></label>
    );
}
